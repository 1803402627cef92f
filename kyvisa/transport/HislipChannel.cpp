#include "kyvisa/transport/HislipChannel.h"

#include <algorithm>

namespace kyvisa
{

using namespace wire::hislip;
using os::IoResult;

namespace
{

/// Data of a response: far beyond any message size that is agreed on, and yet no nonsense.
constexpr std::uint64_t LongestData = std::uint64_t{1} << 40;
/// Everything else: sizes, texts.
constexpr std::uint64_t LongestOther = 64 * 1024;
/// A payload that is kept for finishMessage(): lock strings, sizes.
constexpr std::size_t ShortPayload = 256;

} // namespace

HislipChannel::HislipChannel(os::StreamSocket socket, std::size_t bufferSize)
    : m_socket(std::move(socket)), m_input(bufferSize)
{
}

bool HislipChannel::plausible(const Header &header) const
{
    const bool data = header.type == MessageType::Data || header.type == MessageType::DataEnd;
    return header.payloadLength <= (data ? LongestData : LongestOther);
}

IoResult HislipChannel::next(Header &header, const os::WaitLimit &limit)
{
    if (const IoResult skipped = skipPayload(limit); skipped != IoResult::Done)
        return skipped;
    for (bool first = true; m_input.data().size() < HeaderSize; first = false) {
        if (!first && limit.deadline.expired())
            return IoResult::TimedOut;
        const os::Transfer got = m_input.fill(m_socket, limit);
        if (got.result != IoResult::Done)
            return got.result;
    }
    const auto bytes = m_input.data().first<HeaderSize>();
    if (!decode(bytes, header) || !plausible(header)) {
        m_sawBadHeader = true;
        fail(FatalErrorCode::BadHeader);
        return IoResult::Closed;
    }
    m_input.consume(HeaderSize);
    m_payloadLeft = header.payloadLength;
    return IoResult::Done;
}

os::Transfer HislipChannel::readPayload(std::span<std::byte> to, const os::WaitLimit &limit)
{
    to = to.first(static_cast<std::size_t>(std::min<std::uint64_t>(to.size(), m_payloadLeft)));
    os::Transfer got;
    if (m_input.empty() && to.size() < m_input.capacity())
        got = m_input.fill(m_socket, limit);
    if (got.result == IoResult::Done)
        got = m_input.empty() ? m_socket.receive(to, limit) : os::Transfer{IoResult::Done, m_input.take(to)};
    m_payloadLeft -= got.count;
    return got;
}

IoResult HislipChannel::peekPayload(std::span<const std::byte> &payload, const os::WaitLimit &limit)
{
    if (m_input.empty()) {
        const os::Transfer got = m_input.fill(m_socket, limit);
        if (got.result != IoResult::Done)
            return got.result;
    }
    payload = m_input.data();
    payload = payload.first(static_cast<std::size_t>(std::min<std::uint64_t>(payload.size(), m_payloadLeft)));
    return IoResult::Done;
}

IoResult HislipChannel::skipPayload(const os::WaitLimit &limit)
{
    for (bool first = true; m_payloadLeft > 0; first = false) {
        if (!first && limit.deadline.expired())
            return IoResult::TimedOut;
        std::span<const std::byte> payload;
        const IoResult got = peekPayload(payload, limit);
        if (got != IoResult::Done)
            return got;
        m_payloadLeft -= payload.size();
        m_input.consume(payload.size());
    }
    return IoResult::Done;
}

IoResult HislipChannel::send(const Header &header, std::span<const std::byte> payload, const os::WaitLimit &limit,
                             std::size_t &payloadSent)
{
    m_header = encode(header);
    std::array pieces = {iovec{m_header.data(), m_header.size()},
                         iovec{const_cast<std::byte *>(payload.data()), payload.size()}};
    const os::Transfer sent = m_socket.send(std::span(pieces).first(payload.empty() ? 1 : 2), limit);
    payloadSent = sent.count > HeaderSize ? sent.count - HeaderSize : 0;
    if (sent.result != IoResult::Done && sent.count > 0) {
        m_headerUnsent = HeaderSize - std::min(sent.count, HeaderSize);
        m_payloadUnsent = payload.size() - payloadSent;
        if (payload.size() <= ShortPayload)
            m_shortPayload.assign(payload.begin(), payload.end());
        else
            m_shortPayload.clear();
    }
    return sent.result;
}

IoResult HislipChannel::finishMessage(const os::WaitLimit &limit)
{
    while (messageIsHalfSent()) {
        std::array<std::byte, 4096> filler;
        filler.fill(std::byte{' '});
        const bool inHeader = m_headerUnsent > 0;
        const auto size = static_cast<std::size_t>(std::min<std::uint64_t>(filler.size(), m_payloadUnsent));
        std::byte *payload =
            m_shortPayload.empty() ? filler.data() : m_shortPayload.data() + m_shortPayload.size() - size;
        std::array pieces = {inHeader ? iovec{m_header.data() + (HeaderSize - m_headerUnsent), m_headerUnsent}
                                      : iovec{payload, size}};
        const os::Transfer sent = m_socket.send(pieces, limit);
        if (inHeader)
            m_headerUnsent -= sent.count;
        else
            m_payloadUnsent -= sent.count;
        if (sent.result != IoResult::Done)
            return sent.result;
    }
    return IoResult::Done;
}

void HislipChannel::fail(FatalErrorCode code)
{
    // Not send(): what it keeps belongs to the thread that sends. Behind half a message this goes unnoticed.
    auto bytes = encode({MessageType::FatalError, static_cast<std::uint8_t>(code), 0, 0});
    std::array pieces = {iovec{bytes.data(), bytes.size()}};
    const os::Wakeup nobody;
    m_socket.send(pieces, {os::Deadline::now(), nobody});
    m_socket.shutDown();
}

} // namespace kyvisa
