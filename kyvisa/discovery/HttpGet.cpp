#include "kyvisa/discovery/HttpGet.h"

#include "kyvisa/os/Connector.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <span>
#include <string_view>

namespace kyvisa
{
namespace
{

constexpr int MostRedirections = 3;
constexpr std::string_view EndOfHeader = "\r\n\r\n";

/// The whole answer, header and body, up to @p mostBytes.
std::optional<std::string> request(const std::string &host, std::uint16_t port, const std::string &path,
                                   std::size_t mostBytes, const os::WaitLimit &limit)
{
    os::StreamSocket socket;
    if (os::connectStream(host, port, limit, socket) != os::IoResult::Done)
        return std::nullopt;
    std::string text = "GET " + path + " HTTP/1.1\r\nHost: " + host +
                       "\r\nAccept: text/xml, application/xml\r\nConnection: close\r\n\r\n";
    std::array<iovec, 1> pieces{{{text.data(), text.size()}}};
    if (socket.send(pieces, limit).result != os::IoResult::Done)
        return std::nullopt;
    std::string answer;
    std::array<std::byte, 4096> part;
    for (;;) {
        const os::Transfer transfer = socket.receive(part, limit);
        answer.append(reinterpret_cast<const char *>(part.data()), transfer.count);
        if (answer.size() > mostBytes)
            return std::nullopt;
        if (transfer.result == os::IoResult::Closed)
            return answer;
        if (transfer.result != os::IoResult::Done)
            return std::nullopt;
    }
}

bool equalIgnoringCase(std::string_view a, std::string_view b)
{
    return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                      [](unsigned char x, unsigned char y) { return std::tolower(x) == std::tolower(y); });
}

/// The value of a header field, without the blanks around it.
std::string_view fieldOf(std::string_view header, std::string_view name)
{
    while (!header.empty()) {
        const std::string_view line = header.substr(0, header.find("\r\n"));
        header.remove_prefix(std::min(header.size(), line.size() + 2));
        const std::size_t colon = line.find(':');
        if (colon == line.npos || !equalIgnoringCase(line.substr(0, colon), name))
            continue;
        const std::size_t first = line.find_first_not_of(" \t", colon + 1);
        return first == line.npos ? std::string_view() : line.substr(first, line.find_last_not_of(" \t") + 1 - first);
    }
    return {};
}

/// The path of a redirection that stays on the host and on HTTP, else nothing.
std::optional<std::string> sameHostPath(std::string_view location, const std::string &host)
{
    for (const std::string &prefix : {"http://" + host, std::string()})
        if (location.starts_with(prefix) && location.substr(prefix.size()).starts_with('/') &&
            !location.starts_with("//"))
            return std::string(location.substr(prefix.size()));
    return std::nullopt;
}

/// A body in chunks (RFC 9112 section 7.1) as one piece.
std::optional<std::string> joinChunks(std::string_view body)
{
    std::string joined;
    for (;;) {
        std::size_t size = 0;
        std::size_t digits = 0;
        for (; digits < body.size() && std::isxdigit(static_cast<unsigned char>(body[digits])); ++digits) {
            const auto digit = static_cast<unsigned char>(body[digits]);
            size = size * 16 + static_cast<std::size_t>(std::isdigit(digit) ? digit - '0' : (digit | 0x20) - 'a' + 10);
            if (size > body.size())
                return std::nullopt;
        }
        const std::size_t lineEnd = body.find("\r\n", digits);
        if (digits == 0 || lineEnd == body.npos)
            return std::nullopt;
        if (size == 0)
            return joined;
        body.remove_prefix(lineEnd + 2);
        if (body.size() < size + 2)
            return std::nullopt;
        joined.append(body.substr(0, size));
        body.remove_prefix(size + 2);
    }
}

} // namespace

std::optional<std::string> httpGet(const std::string &host, std::uint16_t port, const std::string &path,
                                   std::size_t mostBytes, const os::WaitLimit &limit)
{
    std::string wanted = path;
    for (int redirections = 0; redirections <= MostRedirections; ++redirections) {
        const std::optional<std::string> answer = request(host, port, wanted, mostBytes, limit);
        const std::size_t headerSize = answer ? answer->find(EndOfHeader) : std::string::npos;
        if (headerSize == std::string::npos || !answer->starts_with("HTTP/1."))
            return std::nullopt;
        const std::string_view header = std::string_view(*answer).substr(0, headerSize);
        const std::string_view body = std::string_view(*answer).substr(headerSize + EndOfHeader.size());
        const std::string_view status = header.substr(std::min(header.size(), header.find(' ') + 1), 3);
        if (status == "200")
            return equalIgnoringCase(fieldOf(header, "Transfer-Encoding"), "chunked") ? joinChunks(body)
                                                                                      : std::string(body);
        const auto target = status.starts_with('3') ? sameHostPath(fieldOf(header, "Location"), host) : std::nullopt;
        if (!target)
            return std::nullopt;
        wanted = *target;
    }
    return std::nullopt;
}

} // namespace kyvisa
