#include "simulator/server/HislipChannel.h"

#include "simulator/fault/MessageForm.h"

#include <algorithm>

namespace simulator
{

using namespace wire::hislip;

namespace
{

constexpr std::size_t MaxUnreadAnswers = 1024 * 1024;

} // namespace

namespace
{

MessageForm formOf(const Header &header, FaultProtocol protocol)
{
    MessageForm form{protocol};
    form.header = HeaderSize;
    form.length = {8, 8};
    if (header.type != MessageType::Data && header.type != MessageType::DataEnd)
        return form;
    form.answer = true;
    form.id = {4, 4};
    form.idStep = 2;
    form.payloadAt = HeaderSize;
    form.payloadSize = static_cast<std::size_t>(header.payloadLength);
    if (header.type == MessageType::DataEnd) {
        form.end = EndMark::Byte;
        form.endAt = 2;
        form.openEnd = static_cast<std::uint8_t>(MessageType::Data);
    }
    return form;
}

} // namespace

void HislipChannel::setFaults(Faults &faults, FaultProtocol protocol)
{
    m_faults = &faults;
    m_protocol = protocol;
}

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
    const Header own{type, control, parameter, payload.size()};
    const auto header = encode(own);
    std::string message{reinterpret_cast<const char *>(header.data()), header.size()};
    message += payload;
    if (m_connection->unsent() == 0)
        m_unreadAnswers = 0;
    m_unreadAnswers += message.size();
    std::vector<Outgoing> pieces;
    pieces.push_back({std::move(message), nullptr, {}});
    transmit(own, std::move(pieces));
}

void HislipChannel::sendData(const Header &header, std::vector<Outgoing> payload)
{
    const auto bytes = encode(header);
    payload.front().text.insert(0, reinterpret_cast<const char *>(bytes.data()), bytes.size());
    transmit(header, std::move(payload));
}

void HislipChannel::transmit(const Header &header, std::vector<Outgoing> message)
{
    if (m_faults)
        m_connection->sendPast(*m_faults, formOf(header, m_protocol), std::move(message));
    else
        m_connection->send(std::move(message));
}

void HislipChannel::sendError(ErrorCode code, std::string_view text)
{
    send(MessageType::Error, static_cast<std::uint8_t>(code), 0, text);
}

void HislipChannel::refuse(ErrorCode code, std::string_view text)
{
    sendError(code, text);
    finish();
}

bool HislipChannel::isFlooded() const
{
    return m_unreadAnswers > MaxUnreadAnswers && m_connection->unsent() > 0;
}

void HislipChannel::sendFatalError(FatalErrorCode code, std::string_view text)
{
    send(MessageType::FatalError, static_cast<std::uint8_t>(code), 0, text);
}

} // namespace simulator
