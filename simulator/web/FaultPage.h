#pragma once

#include <string>

namespace simulator
{

class Faults;
class HttpServer;
class WebSite;

/// The sections of the page on which people see, add and remove faults.
std::string faultPage(const Faults &faults);

/// Adds the page, and what its forms post: `/faults/add`, `/faults/remove`, `/faults/seed`.
void addFaultPage(WebSite &site, HttpServer &server, Faults &faults);

} // namespace simulator
