#pragma once

#include "simulator/fault/FaultSpec.h"
#include "simulator/server/Connection.h"
#include "wire/Hislip.h"

#include <cstdint>
#include <memory>
#include <span>
#include <string_view>

namespace simulator
{

/**
 * One of the two connections of a HiSLIP client, cut into messages.
 *
 *     while (channel.next() == HislipChannel::Next::Message) {
 *         look at header(); use payload() when payloadComplete(), or take it piece by piece with available() and taken()
 *         channel.finish();                 // what was not taken is drained as it comes
 *     }
 *
 * A message that cannot be dealt with yet is simply not finished: next() shows it again.
 */
class HislipChannel
{
public:
    enum class Next : std::uint8_t { Nothing, Message, Malformed };

    explicit HislipChannel(std::unique_ptr<Connection> connection) : m_connection(std::move(connection)) {}

    Connection &connection() { return *m_connection; }
    std::unique_ptr<Connection> release() { return std::move(m_connection); }

    Next next();
    const wire::hislip::Header &header() const { return m_header; }
    /// Payload bytes of the message that have not been taken.
    std::uint64_t remaining() const { return m_remaining; }
    bool inMessage() const { return m_inMessage; }
    bool payloadComplete() const { return m_connection->input().size() >= m_remaining; }
    std::string_view payload() const;
    std::span<const std::byte> available() const;
    void taken(std::size_t count);
    /// As taken(), for bytes that did not pass through the connection's buffer.
    void takenDirectly(std::size_t count) { m_remaining -= count; }
    void finish();
    /// Header of the message behind the one that is being taken, as far as it has come.
    bool peekNext(wire::hislip::Header &header) const;

    /// Every message from now on goes past the faults first.
    void setFaults(Faults &faults, FaultProtocol protocol);

    void send(wire::hislip::MessageType type, std::uint8_t control = 0, std::uint32_t parameter = 0,
              std::string_view payload = {});
    /// A piece of a response; @p header tells its length.
    void sendData(const wire::hislip::Header &header, std::vector<Outgoing> payload);
    void sendError(wire::hislip::ErrorCode code, std::string_view text);
    void sendFatalError(wire::hislip::FatalErrorCode code, std::string_view text);
    /// Answers an Error to the message that next() shows, and drains that.
    void refuse(wire::hislip::ErrorCode code, std::string_view text);
    /// True when the client provokes answers and never reads them. Responses do not count: they wait for the client.
    bool isFlooded() const;

private:
    void transmit(const wire::hislip::Header &header, std::vector<Outgoing> message);

    std::unique_ptr<Connection> m_connection;
    Faults *m_faults = nullptr;
    FaultProtocol m_protocol{};
    wire::hislip::Header m_header;
    std::uint64_t m_remaining = 0;
    bool m_inMessage = false;
    bool m_draining = false;
    std::size_t m_unreadAnswers = 0; ///< bytes sent since the client had taken all
};

} // namespace simulator
