#pragma once

#include <cstddef>
#include <map>
#include <span>
#include <string>
#include <string_view>

namespace simulator
{

/// One HTTP/1.x request (RFC 9112).
struct HttpRequest {
    std::string method;
    std::string path;                          ///< without query, percent signs resolved
    std::string query;                         ///< behind the '?', as it came
    std::map<std::string, std::string> fields; ///< names in lower case; values of a repeated one joined with ", "
    std::string body;
    bool keepAlive = true;

    std::string_view field(const std::string &name) const;
};

/// Names and values of an HTML form as browsers send it (application/x-www-form-urlencoded); of a repeated name the first value.
std::map<std::string, std::string> formValues(std::string_view text);

/**
 * Makes requests of bytes as they come, in pieces of any size. Nothing it keeps is longer than its limits:
 *
 *     switch (reader.read(bytes)) {                      // takes from the front
 *     case Complete:  answer(reader.take());             // and is ready for the next one
 *     case Failed:    refuse(reader.failure());          // the status to answer with; the connection is of no more use
 *     case NeedsMore: if (reader.takeExpectation()) ...  // the client waits for "100 Continue" before it sends the body
 *     }
 */
class HttpRequestReader
{
public:
    enum class Progress { NeedsMore, Complete, Failed };

    static constexpr std::size_t MaxLine = 8 * 1024;
    static constexpr std::size_t MaxHead = 16 * 1024; ///< of all lines before the body
    static constexpr std::size_t MaxBody = 64 * 1024;

    Progress read(std::span<const std::byte> &bytes);
    /// A part of a request is there.
    bool begun() const { return m_headSize != 0; }
    /// True once when the client asked for a word before it sends the body.
    bool takeExpectation();
    int failure() const { return m_failure; }
    HttpRequest take();

private:
    enum class State { Start, Fields, Body, Complete, Failed };

    void line(std::string_view line);
    void requestLine(std::string_view line);
    void target(std::string_view target);
    void field(std::string_view line);
    void headEnds();
    void fail(int status);

    State m_state = State::Start;
    int m_failure = 0;
    std::string m_line;
    std::size_t m_headSize = 0;
    bool m_isVersion10 = false;
    bool m_expects = false;
    std::size_t m_bodyLeft = 0;
    HttpRequest m_request;
};

} // namespace simulator
