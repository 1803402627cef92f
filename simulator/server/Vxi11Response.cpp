#include "simulator/server/Vxi11Response.h"

#include "simulator/instrument/Bytes.h"

#include <algorithm>
#include <cstring>

namespace simulator
{

void Vxi11Response::begin(ResponseSegments segments)
{
    m_pieces.clear();
    for (ResponseSegment &segment : segments) {
        if (!segment.text.empty())
            m_pieces.push_back({std::move(segment.text), nullptr, {}});
        if (segment.block && segment.block->size() > 0)
            m_pieces.push_back({{}, segment.block, segment.block->view()});
    }
}

Vxi11Response::Piece Vxi11Response::take(std::size_t most, std::optional<std::uint8_t> termination)
{
    Piece piece;
    while (piece.size < most && !m_pieces.empty() && !piece.matched) {
        Outgoing &first = m_pieces.front();
        const void *data = first.text.empty() ? static_cast<const void *>(first.bytes.data()) : first.text.data();
        std::size_t count = std::min(first.size(), most - piece.size);
        if (termination) {
            if (const void *found = std::memchr(data, *termination, count)) {
                count =
                    static_cast<std::size_t>(static_cast<const char *>(found) - static_cast<const char *>(data)) + 1;
                piece.matched = true;
            }
        }
        piece.size += count;
        if (count == first.size()) {
            piece.bytes.push_back(std::move(first));
            m_pieces.pop_front();
        } else if (!first.text.empty()) {
            piece.bytes.push_back({first.text.substr(0, count), nullptr, {}});
            first.text.erase(0, count);
        } else {
            piece.bytes.push_back({{}, first.keeper, first.bytes.first(count)});
            first.bytes = first.bytes.subspan(count);
        }
    }
    piece.last = m_pieces.empty();
    return piece;
}

} // namespace simulator
