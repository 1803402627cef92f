#include "simulator/server/Outgoing.h"

#include "simulator/instrument/Bytes.h"

#include <utility>

namespace simulator
{

std::vector<Outgoing> toOutgoing(ResponseSegments segments)
{
    std::vector<Outgoing> pieces;
    pieces.reserve(segments.size());
    for (ResponseSegment &segment : segments) {
        const std::span<const std::byte> bytes = segment.block ? segment.block->view() : std::span<const std::byte>{};
        pieces.push_back({std::move(segment.text), std::move(segment.block), bytes});
    }
    return pieces;
}

std::size_t sizeOf(const std::vector<Outgoing> &pieces)
{
    std::size_t size = 0;
    for (const Outgoing &piece : pieces)
        size += piece.size();
    return size;
}

} // namespace simulator
