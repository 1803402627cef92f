#include "simulator/traffic/TrafficLog.h"

#include "simulator/instrument/Bytes.h"

#include <array>
#include <cstdio>
#include <utility>

namespace simulator
{

TrafficLog::Client::Client(TrafficLog &log, std::string protocol, std::string name)
    : m_log(log), m_protocol(std::move(protocol)), m_name(std::move(name))
{
    m_log.m_clients.push_back(this);
    event("connected");
}

TrafficLog::Client::~Client()
{
    std::erase(m_log.m_clients, this);
    event("disconnected");
}

void TrafficLog::Client::received(std::span<const std::byte> bytes)
{
    if (m_log.isWatched())
        m_message.add(bytes);
}

void TrafficLog::Client::blockReceived(std::size_t count)
{
    if (m_log.isWatched())
        m_message.skip(count);
}

void TrafficLog::Client::messageEnds()
{
    ++m_messages;
    if (m_log.isWatched())
        tell(Kind::ToInstrument, m_message.take());
}

void TrafficLog::Client::forget()
{
    if (!m_message.empty())
        m_message.take();
}

void TrafficLog::Client::answered(const ResponseSegments &response)
{
    if (!m_log.isWatched())
        return;
    MessageText text;
    for (const ResponseSegment &segment : response) {
        text.add(segment.text);
        if (segment.block)
            text.skip(segment.block->size());
    }
    tell(Kind::FromInstrument, text.take());
}

void TrafficLog::Client::event(std::string_view what)
{
    if (m_log.isWatched())
        tell(Kind::Event, what);
}

void TrafficLog::Client::event(std::string_view what, std::uint8_t statusByte)
{
    if (!m_log.isWatched())
        return;
    std::array<char, 8> value{};
    std::snprintf(value.data(), value.size(), " 0x%02X", static_cast<unsigned>(statusByte));
    tell(Kind::Event, std::string(what) + value.data());
}

void TrafficLog::Client::lock(std::string_view what, std::string_view key, std::string_view outcome)
{
    if (!m_log.isWatched())
        return;
    std::string text(what);
    if (key.empty()) {
        text += " exclusive";
    } else {
        MessageText readable; // the key is whatever a client says
        readable.add(key);
        text += " shared '" + readable.take() + "'";
    }
    if (!outcome.empty())
        text.append(": ").append(outcome);
    tell(Kind::Event, text);
}

void TrafficLog::Client::tell(Kind kind, std::string_view text) const
{
    const Entry entry{std::chrono::system_clock::now(), kind, m_protocol, m_name, text};
    for (Watcher *watcher : m_log.m_watchers)
        watcher->seen(entry);
}

} // namespace simulator
