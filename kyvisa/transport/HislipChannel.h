#pragma once

#include "kyvisa/os/StreamSocket.h"
#include "kyvisa/transport/ReceiveBuffer.h"
#include "wire/Hislip.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace kyvisa
{

/**
 * One of the two connections of a HiSLIP session: messages out, messages in.
 *
 * Receiving stops and goes on at any byte: a wait that times out inside a header or a payload leaves everything as it is.
 * Payloads are handed on as they come and nothing is ever allocated by a length from the wire. A header that makes no sense
 * ends the connection.
 */
class HislipChannel
{
public:
    HislipChannel(os::StreamSocket socket, std::size_t bufferSize);

    bool isOpen() const { return m_socket.isOpen(); }
    void close() { m_socket.close(); }
    os::StreamSocket &socket() { return m_socket; }

    /// Skips what is left of the current message and receives the header of the next one.
    os::IoResult next(wire::hislip::Header &header, const os::WaitLimit &limit);

    std::uint64_t payloadLeft() const { return m_payloadLeft; }
    /// Moves payload, at least one byte when Done. Large pieces go straight into @p to.
    os::Transfer readPayload(std::span<std::byte> to, const os::WaitLimit &limit);
    /// Payload that is here already, at least one byte when Done.
    os::IoResult peekPayload(std::span<const std::byte> &payload, const os::WaitLimit &limit);
    os::IoResult skipPayload(const os::WaitLimit &limit);

    /// Sends one message in one go. @param payloadSent bytes of the payload that left, also when it ended early.
    os::IoResult send(const wire::hislip::Header &header, std::span<const std::byte> payload,
                      const os::WaitLimit &limit, std::size_t &payloadSent);
    /// A message stopped in the middle: nothing else can be sent before finishMessage().
    bool messageIsHalfSent() const { return unsent() > 0; }
    std::uint64_t unsent() const { return m_headerUnsent + m_payloadUnsent; }
    /// Sends the rest. A short payload goes out as it was meant, a long one is not kept and replaced by filler: for a peer
    /// that is going to discard it.
    os::IoResult finishMessage(const os::WaitLimit &limit);

    /// Tells the peer that the connection is beyond repair, if that is possible without waiting, and ends it. The
    /// descriptor stays until close(): the other thread may be sending.
    void fail(wire::hislip::FatalErrorCode code);
    /// A header made no sense. For the thread that receives.
    bool sawBadHeader() const { return m_sawBadHeader; }

private:
    bool plausible(const wire::hislip::Header &header) const;

    os::StreamSocket m_socket;
    ReceiveBuffer m_input;
    std::uint64_t m_payloadLeft = 0;
    std::array<std::byte, wire::hislip::HeaderSize> m_header{}; ///< of the message being sent
    std::size_t m_headerUnsent = 0;
    std::uint64_t m_payloadUnsent = 0;
    bool m_sawBadHeader = false;
    std::vector<std::byte> m_shortPayload; ///< its last bytes are the unsent ones; empty for a long payload
};

} // namespace kyvisa
