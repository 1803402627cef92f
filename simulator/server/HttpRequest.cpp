#include "simulator/server/HttpRequest.h"

#include <algorithm>
#include <charconv>
#include <cstring>
#include <optional>
#include <utility>

namespace simulator
{
namespace
{

constexpr int BadRequest = 400;
constexpr int LengthRequired = 411;
constexpr int ContentTooLarge = 413;
constexpr int UriTooLong = 414;
constexpr int ExpectationFailed = 417;
constexpr int FieldsTooLarge = 431;
constexpr int VersionNotSupported = 505;

bool isLetterOrDigit(char c)
{
    return (c >= '0' && c <= '9') || (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z');
}

bool isToken(std::string_view text)
{
    return !text.empty() && std::all_of(text.begin(), text.end(), [](char c) {
        return isLetterOrDigit(c) || (c != '\0' && std::strchr("!#$%&'*+-.^_`|~", c) != nullptr);
    });
}

bool isVisible(char c)
{
    return c > ' ' && c < '\x7F';
}

std::string lowerCase(std::string_view text)
{
    std::string result(text);
    for (char &c : result)
        if (c >= 'A' && c <= 'Z')
            c = static_cast<char>(c - 'A' + 'a');
    return result;
}

std::string_view trimmed(std::string_view text)
{
    const std::size_t first = text.find_first_not_of(" \t");
    if (first == text.npos)
        return {};
    return text.substr(first, text.find_last_not_of(" \t") - first + 1);
}

int hexDigit(char c)
{
    if (c >= '0' && c <= '9')
        return c - '0';
    if (c >= 'A' && c <= 'F')
        return c - 'A' + 10;
    return c >= 'a' && c <= 'f' ? c - 'a' + 10 : -1;
}

/// Nothing when a percent sign has no two digits behind it.
std::optional<std::string> percentDecoded(std::string_view text)
{
    std::string result;
    while (!text.empty()) {
        if (text.front() != '%') {
            result += text.front();
            text.remove_prefix(1);
            continue;
        }
        const int high = text.size() > 2 ? hexDigit(text[1]) : -1;
        const int low = text.size() > 2 ? hexDigit(text[2]) : -1;
        if (high < 0 || low < 0)
            return std::nullopt;
        result += static_cast<char>(high * 16 + low);
        text.remove_prefix(3);
    }
    return result;
}

/// Whether a list like "keep-alive, Upgrade" has this element.
bool lists(std::string_view list, std::string_view element)
{
    while (!list.empty()) {
        const std::size_t comma = std::min(list.find(','), list.size());
        if (lowerCase(trimmed(list.substr(0, comma))) == element)
            return true;
        list.remove_prefix(std::min(comma + 1, list.size()));
    }
    return false;
}

} // namespace

std::string_view HttpRequest::field(const std::string &name) const
{
    const auto found = fields.find(name);
    return found == fields.end() ? std::string_view{} : std::string_view{found->second};
}

std::map<std::string, std::string> formValues(std::string_view text)
{
    std::map<std::string, std::string> values;
    const auto decoded = [](std::string_view part) {
        std::string spaced(part);
        std::replace(spaced.begin(), spaced.end(), '+', ' ');
        return percentDecoded(spaced).value_or(spaced);
    };
    while (!text.empty()) {
        const std::size_t end = std::min(text.find('&'), text.size());
        const std::string_view pair = text.substr(0, end);
        const std::size_t equals = std::min(pair.find('='), pair.size());
        if (!pair.empty())
            values.emplace(decoded(pair.substr(0, equals)), decoded(pair.substr(std::min(equals + 1, pair.size()))));
        text.remove_prefix(std::min(end + 1, text.size()));
    }
    return values;
}

HttpRequestReader::Progress HttpRequestReader::read(std::span<const std::byte> &bytes)
{
    while (!bytes.empty() && (m_state == State::Start || m_state == State::Fields)) {
        const char *data = reinterpret_cast<const char *>(bytes.data());
        const auto *feed = static_cast<const char *>(std::memchr(data, '\n', bytes.size()));
        const std::size_t count = feed == nullptr ? bytes.size() : static_cast<std::size_t>(feed - data) + 1;
        m_headSize += count;
        if (m_line.size() + count > MaxLine || m_headSize > MaxHead) {
            fail(m_state == State::Start ? UriTooLong : FieldsTooLarge);
            break;
        }
        m_line.append(data, count);
        bytes = bytes.subspan(count);
        if (feed != nullptr) {
            // A bare line feed ends a line too (RFC 9112, 2.2).
            std::string text = std::exchange(m_line, {});
            text.pop_back();
            if (text.ends_with('\r'))
                text.pop_back();
            line(text);
        }
    }
    if (m_state == State::Body) {
        const std::size_t count = std::min(m_bodyLeft, bytes.size());
        m_request.body.append(reinterpret_cast<const char *>(bytes.data()), count);
        bytes = bytes.subspan(count);
        m_bodyLeft -= count;
        if (m_bodyLeft == 0)
            m_state = State::Complete;
    }
    if (m_state == State::Failed)
        return Progress::Failed;
    return m_state == State::Complete ? Progress::Complete : Progress::NeedsMore;
}

bool HttpRequestReader::takeExpectation()
{
    return m_state == State::Body && std::exchange(m_expects, false);
}

HttpRequest HttpRequestReader::take()
{
    HttpRequest request = std::move(m_request);
    *this = {};
    return request;
}

void HttpRequestReader::line(std::string_view line)
{
    if (std::any_of(line.begin(), line.end(), [](char c) { return c == '\0' || c == '\r' || c == '\n'; }))
        return fail(BadRequest);
    if (m_state == State::Start) {
        // Empty lines before a request are passed over; MaxHead ends that.
        if (!line.empty())
            requestLine(line);
    } else if (line.empty()) {
        headEnds();
    } else {
        field(line);
    }
}

void HttpRequestReader::requestLine(std::string_view line)
{
    const std::size_t first = line.find(' ');
    const std::size_t last = line.rfind(' ');
    if (first == line.npos || first == last)
        return fail(BadRequest);
    const std::string_view version = line.substr(last + 1);
    m_request.method = line.substr(0, first);
    if (!isToken(m_request.method))
        return fail(BadRequest);
    if (version.size() != 8 || !version.starts_with("HTTP/") || version[6] != '.')
        return fail(BadRequest);
    if (version[5] != '1')
        return fail(VersionNotSupported);
    m_isVersion10 = version[7] == '0';
    m_state = State::Fields;
    target(line.substr(first + 1, last - first - 1));
}

void HttpRequestReader::target(std::string_view target)
{
    if (!std::all_of(target.begin(), target.end(), isVisible))
        return fail(BadRequest);
    if (lowerCase(target.substr(0, 7)) == "http://") {
        const std::size_t slash = target.find_first_of("/?", 7);
        target = slash == target.npos ? std::string_view{"/"} : target.substr(slash);
    }
    const std::size_t question = std::min(target.find('?'), target.size());
    m_request.query = target.substr(std::min(question + 1, target.size()));
    const std::optional<std::string> path = percentDecoded(target.substr(0, question));
    if (!path || (!path->starts_with('/') && *path != "*"))
        return fail(BadRequest);
    m_request.path = *path;
}

void HttpRequestReader::field(std::string_view line)
{
    const std::size_t colon = line.find(':');
    // Also refuses a folded line and a blank before the colon, with which two readers can come to different requests.
    if (colon == line.npos || !isToken(line.substr(0, colon)))
        return fail(BadRequest);
    const std::string name = lowerCase(line.substr(0, colon));
    const std::string_view value = trimmed(line.substr(colon + 1));
    const auto [entry, isNew] = m_request.fields.emplace(name, value);
    if (isNew)
        return;
    if (name == "host" || (name == "content-length" && entry->second != value))
        return fail(BadRequest);
    if (name != "content-length")
        entry->second.append(", ").append(value);
}

void HttpRequestReader::headEnds()
{
    const HttpRequest &request = m_request;
    if (!m_isVersion10 && !request.fields.contains("host"))
        return fail(BadRequest);
    const std::string_view connection = request.field("connection");
    m_request.keepAlive = m_isVersion10 ? lists(connection, "keep-alive") : !lists(connection, "close");
    if (request.fields.contains("transfer-encoding"))
        return fail(request.fields.contains("content-length") ? BadRequest : LengthRequired);
    if (const auto length = request.fields.find("content-length"); length != request.fields.end()) {
        const std::string &digits = length->second;
        const char *end = digits.data() + digits.size();
        const auto [stop, error] = std::from_chars(digits.data(), end, m_bodyLeft);
        if (error == std::errc::result_out_of_range)
            return fail(ContentTooLarge);
        if (error != std::errc{} || stop != end)
            return fail(BadRequest);
        if (m_bodyLeft > MaxBody)
            return fail(ContentTooLarge);
    }
    if (const std::string_view expect = request.field("expect"); !expect.empty() && !m_isVersion10) {
        if (lowerCase(expect) != "100-continue")
            return fail(ExpectationFailed);
        m_expects = true;
    }
    m_state = State::Body;
}

void HttpRequestReader::fail(int status)
{
    m_state = State::Failed;
    m_failure = status;
}

} // namespace simulator
