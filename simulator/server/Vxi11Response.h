#pragma once

#include "simulator/server/Outgoing.h"

#include <cstdint>
#include <deque>
#include <optional>

namespace simulator
{

/// A response that a VXI-11 client fetches piece by piece, each as long as it likes. Blocks are shared, not copied.
class Vxi11Response
{
public:
    struct Piece {
        std::vector<Outgoing> bytes;
        std::size_t size = 0;
        bool last = false;    ///< nothing is left: its last byte carries END
        bool matched = false; ///< its last byte is the termination character asked for
    };

    void begin(ResponseSegments segments);
    bool active() const { return !m_pieces.empty(); }
    void drop() { m_pieces.clear(); }
    /// Cuts off at most @p most bytes, at least one, up to and including the first @p termination.
    Piece take(std::size_t most, std::optional<std::uint8_t> termination);

private:
    std::deque<Outgoing> m_pieces; ///< each with text or bytes, not both
};

} // namespace simulator
