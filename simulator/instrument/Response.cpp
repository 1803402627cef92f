#include "simulator/instrument/Response.h"

#include "simulator/instrument/Bytes.h"

#include <array>
#include <charconv>
#include <cmath>
#include <utility>

namespace simulator
{
namespace
{

// What a segment costs beside its text.
constexpr std::size_t SegmentOverhead = 64;
constexpr std::size_t LargestCountedBlock = 999'999'999;

std::string blockHeader(std::size_t size)
{
    const std::string digits = std::to_string(size);
    if (size > LargestCountedBlock)
        return "#(" + digits + ")";
    return "#" + std::to_string(digits.size()) + digits;
}

} // namespace

std::size_t sizeOf(const ResponseSegments &segments)
{
    std::size_t size = 0;
    for (const ResponseSegment &segment : segments)
        size += segment.text.size() + (segment.block ? segment.block->size() : 0);
    return size;
}

std::string &ResponseUnit::element()
{
    const bool first = m_segments.empty();
    if (first || m_segments.back().block)
        m_segments.emplace_back();
    std::string &text = m_segments.back().text;
    if (!first)
        text += ',';
    return text;
}

void ResponseUnit::integer(std::int64_t value)
{
    element() += std::to_string(value);
}

void ResponseUnit::real(double value)
{
    if (std::isnan(value))
        return plain("9.91E37");
    if (std::isinf(value))
        return plain(value > 0 ? "9.9E37" : "-9.9E37");
    std::array<char, 32> buffer;
    char *end =
        std::to_chars(buffer.data(), buffer.data() + buffer.size(), value, std::chars_format::scientific, 6).ptr;
    for (char *c = buffer.data(); c != end; ++c)
        if (*c == 'e')
            *c = 'E';
    plain({buffer.data(), static_cast<std::size_t>(end - buffer.data())});
}

void ResponseUnit::string(std::string_view text)
{
    std::string &to = element();
    to += '"';
    for (const char c : text) {
        if (c == '"')
            to += '"';
        to += c;
    }
    to += '"';
}

void ResponseUnit::plain(std::string_view text)
{
    element() += text;
}

void ResponseUnit::arbitrary(std::string_view text)
{
    plain(text);
    m_indefinite = true;
}

void ResponseUnit::block(std::shared_ptr<const Bytes> content)
{
    element() += blockHeader(content->size());
    m_segments.back().block = std::move(content);
}

ResponseSegments ResponseUnit::take()
{
    m_indefinite = false;
    return std::exchange(m_segments, {});
}

bool OutputQueue::add(ResponseSegments unit)
{
    std::size_t size = 1;
    for (const ResponseSegment &segment : unit)
        size += segment.text.size() + SegmentOverhead;
    if (m_textSize + size > TextCapacity)
        return false;
    m_textSize += size;
    if (m_segments.empty()) {
        m_segments = std::move(unit);
        return true;
    }
    unit.front().text.insert(0, 1, ';');
    for (ResponseSegment &segment : unit) {
        if (m_segments.back().block)
            m_segments.push_back(std::move(segment));
        else {
            m_segments.back().text += segment.text;
            m_segments.back().block = std::move(segment.block);
        }
    }
    return true;
}

void OutputQueue::complete()
{
    if (m_segments.back().block)
        m_segments.emplace_back();
    m_segments.back().text += '\n';
    m_complete = true;
}

ResponseSegments OutputQueue::take()
{
    m_textSize = 0;
    m_complete = false;
    return std::exchange(m_segments, {});
}

void OutputQueue::clear()
{
    take();
}

} // namespace simulator
