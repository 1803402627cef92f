#pragma once

#include "simulator/server/Outgoing.h"

#include <cstddef>
#include <cstdint>
#include <deque>

namespace simulator
{

class HislipChannel;
class HislipDelivery;

/**
 * A response on its way to a HiSLIP client: cut into Data messages that the client can take, the last one a DataEND. They are made only as fast as
 * the connection takes them, so a small message size costs time and no memory. Blocks are shared, not copied.
 */
class HislipResponse
{
public:
    void begin(ResponseSegments segments, std::uint32_t request);
    bool active() const { return m_left > 0; }
    void drop();
    /// Makes and sends messages of at most @p maxPayload bytes, with ids of @p delivery. Returns when all is made or when the connection has enough for now.
    void pump(HislipChannel &channel, std::size_t maxPayload, HislipDelivery &delivery);

private:
    std::vector<Outgoing> cut(std::size_t size);

    std::deque<Outgoing> m_pieces;
    std::size_t m_left = 0;
    std::uint32_t m_request = 0; ///< id of the message that caused it
};

} // namespace simulator
