#include "simulator/server/HislipChannel.h"

#include <algorithm>

namespace simulator
{

using namespace wire::hislip;

HislipChannel::Next HislipChannel::next()
{
    if (m_draining) {
        taken(available().size());
        if (m_remaining > 0)
            return Next::Nothing;
        m_draining = m_inMessage = false;
    }
    if (m_inMessage)
        return Next::Message;
    const std::span<const std::byte> input = m_connection->input();
    if (input.size() < HeaderSize)
        return Next::Nothing;
    if (!decode(input.first<HeaderSize>(), m_header))
        return Next::Malformed;
    m_connection->consume(HeaderSize);
    m_remaining = m_header.payloadLength;
    m_inMessage = true;
    return Next::Message;
}

std::string_view HislipChannel::payload() const
{
    const std::span<const std::byte> bytes = available();
    return {reinterpret_cast<const char *>(bytes.data()), bytes.size()};
}

std::span<const std::byte> HislipChannel::available() const
{
    const std::span<const std::byte> input = m_connection->input();
    return input.first(static_cast<std::size_t>(std::min<std::uint64_t>(input.size(), m_remaining)));
}

void HislipChannel::taken(std::size_t count)
{
    m_remaining -= count;
    m_connection->consume(count);
}

void HislipChannel::finish()
{
    m_draining = true;
}

bool HislipChannel::peekNext(Header &header) const
{
    std::span<const std::byte> input = m_connection->input();
    if (input.size() < m_remaining + HeaderSize)
        return false;
    input = input.subspan(static_cast<std::size_t>(m_remaining));
    return decode(input.first<HeaderSize>(), header);
}

void HislipChannel::send(MessageType type, std::uint8_t control, std::uint32_t parameter, std::string_view payload)
{
    const auto header = encode({type, control, parameter, payload.size()});
    std::string message{reinterpret_cast<const char *>(header.data()), header.size()};
    message += payload;
    m_connection->send(std::move(message));
}

void HislipChannel::sendError(ErrorCode code, std::string_view text)
{
    send(MessageType::Error, static_cast<std::uint8_t>(code), 0, text);
}

void HislipChannel::sendFatalError(FatalErrorCode code, std::string_view text)
{
    send(MessageType::FatalError, static_cast<std::uint8_t>(code), 0, text);
}

} // namespace simulator
