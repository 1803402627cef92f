#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace simulator
{

class Bytes;

/// A stretch of a response: some text, then perhaps a stored block, which is shared and not copied.
struct ResponseSegment {
    std::string text;
    std::shared_ptr<const Bytes> block;
};

using ResponseSegments = std::vector<ResponseSegment>;

std::size_t sizeOf(const ResponseSegments &segments);

/// Formats the answer of one query: elements in order, the commas between them are added here.
class ResponseUnit
{
public:
    void integer(std::int64_t value);      ///< NR1
    void real(double value);               ///< NR3; 9.9E37 and 9.91E37 for what is no number
    void string(std::string_view text);    ///< in double quotes
    void plain(std::string_view text);     ///< character data, or elements formatted already
    void arbitrary(std::string_view text); ///< arbitrary ASCII: nothing may follow it in the response
    void block(std::shared_ptr<const Bytes> content);

    bool empty() const { return m_segments.empty(); }
    bool indefinite() const { return m_indefinite; }
    ResponseSegments take();

private:
    std::string &element();

    ResponseSegments m_segments;
    bool m_indefinite = false;
};

/// The output queue of one message exchange: the response message that is being made, and that then waits to be sent.
class OutputQueue
{
public:
    static constexpr std::size_t TextCapacity = 1024 * 1024;

    /// Adds the answer of one unit. False, and nothing is added, when the queue is full.
    bool add(ResponseSegments unit);
    /// The program message has ended: the response is complete, with its line feed.
    void complete();
    bool isComplete() const { return m_complete; }
    bool empty() const { return m_segments.empty(); }
    const ResponseSegments &segments() const { return m_segments; }
    ResponseSegments take();
    void clear();

private:
    ResponseSegments m_segments;
    std::size_t m_textSize = 0;
    bool m_complete = false;
};

} // namespace simulator
