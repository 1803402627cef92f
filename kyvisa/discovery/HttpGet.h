#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>

namespace kyvisa
{

namespace os
{
struct WaitLimit;
}

/**
 * Fetches one document from the web server of an instrument (RFC 9112, without keeping the connection), following
 * redirections on the same host.
 *
 * @param path with its leading slash. @param limit bounds the whole, redirections included.
 * @return the body; nothing for any answer but 200, and for one of more than @p mostBytes.
 */
std::optional<std::string> httpGet(const std::string &host, std::uint16_t port, const std::string &path,
                                   std::size_t mostBytes, const os::WaitLimit &limit);

} // namespace kyvisa
