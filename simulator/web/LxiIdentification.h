#pragma once

#include <string>
#include <vector>

namespace simulator
{

struct Identification;
struct ServedAt;

/// The LXI identification document (XML, namespace InstrumentIdentification/1.0). @p host is how the client reached the instrument,
/// "127.0.0.1:8080"; it stands in the links.
std::string lxiIdentification(const Identification &identity, const std::vector<ServedAt> &services,
                              const std::string &host);

} // namespace simulator
