#pragma once

#include "wire/Hislip.h"

#include <cstdint>

namespace simulator
{

/**
 * What a HiSLIP client has read of its responses, as far as it has said so, and the message ids that go with it. The rules depend on the mode:
 *
 * - Synchronized: a response carries the id of the message that asked for it. A client that sends again without having said that it has read the last
 *   response (RMT-delivered) has interrupted it.
 * - Overlapped: the messages of all responses are counted in one row of ids, and nothing is ever interrupted. A status query names the last message that
 *   the client has read; a message with RMT-delivered says that it has read at least one response, which tells all only where one is unread.
 */
class HislipDelivery
{
public:
    /// Counts anew, after the initialization and after each device clear.
    void restart(bool overlapped);
    bool overlapped() const { return m_overlapped; }

    /// The id of the next Data or DataEND of a response to the message @p request.
    std::uint32_t nextId(std::uint32_t request);
    /// The last message of a response has been made.
    void responseSent() { ++m_unread; }

    /// Data, DataEND or Trigger came, with or without RMT-delivered. False when it interrupts an unread response.
    bool messageCame(bool delivered);
    /// A status query came, naming message @p id.
    void statusQueryCame(bool delivered, std::uint32_t id);
    /// Every complete response has been read.
    bool allRead() const { return m_unread == 0; }

private:
    void read();

    bool m_overlapped = false;
    std::uint32_t m_lastId = wire::hislip::NothingSentId; ///< overlapped mode: of the last message to the client
    unsigned m_unread = 0;                                ///< complete responses; at most one in synchronized mode
};

} // namespace simulator
