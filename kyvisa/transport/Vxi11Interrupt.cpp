#include "kyvisa/transport/Vxi11Interrupt.h"

#include "kyvisa/os/Poll.h"
#include "kyvisa/os/Thread.h"
#include "kyvisa/os/UniqueText.h"
#include "wire/Rpc.h"

#include <algorithm>
#include <array>
#include <system_error>
#include <vector>

namespace kyvisa
{

using namespace wire;
using os::IoResult;

namespace
{

constexpr std::size_t HandleLength = 8;
constexpr std::size_t LongestRecord = 4096;
/// An instrument has one. More are old ones that it forgot, or strangers.
constexpr std::size_t MaxChannels = 4;
constexpr std::chrono::milliseconds Rest{100};

} // namespace

Vxi11Interrupt::~Vxi11Interrupt()
{
    m_stop.close();
    if (m_thread)
        m_thread->join();
}

void Vxi11Interrupt::abandon()
{
    static_cast<void>(m_thread.release()); // it is in another process: neither to be joined nor to be destroyed
    m_listener.close();
    for (Channel &channel : m_channels)
        channel.socket.close();
    m_stop.abandon();
}

bool Vxi11Interrupt::start(std::uint32_t address)
{
    m_address = address;
    m_handle = os::uniqueText().substr(0, HandleLength);
    if (!m_stop.valid() || !m_listener.open(address))
        return false;
    try {
        auto thread = std::make_unique<std::thread>(); // before it runs: without room for it there is none to end
        *thread = os::startThread([this] { serve(); });
        m_thread = std::move(thread);
    } catch (const std::system_error &) {
        return false;
    }
    return true;
}

void Vxi11Interrupt::setNotify(std::function<void()> notify)
{
    const std::lock_guard lock(m_mutex);
    m_notify = std::move(notify);
}

vxi11::RemoteFunc Vxi11Interrupt::where() const
{
    vxi11::RemoteFunc function;
    function.hostAddress = m_address;
    function.hostPort = m_listener.port();
    return function;
}

void Vxi11Interrupt::serve()
{
    const os::WaitLimit limit{os::Deadline::never(), m_stop};
    try {
        for (;;) {
            std::vector<pollfd> watched{{m_listener.descriptor(), POLLIN, 0}};
            for (const Channel &channel : m_channels)
                watched.push_back({channel.socket.descriptor(), POLLIN, 0});
            watched.push_back({});
            if (os::pollWithin(watched, limit) != IoResult::Done)
                return;
            auto ready = watched.begin() + 1;
            for (auto channel = m_channels.begin(); channel != m_channels.end(); ++ready)
                channel = ready->revents == 0 || receive(*channel) ? std::next(channel) : m_channels.erase(channel);
            if (watched.front().revents == 0)
                continue;
            os::StreamSocket socket = m_listener.accept();
            if (!socket.isOpen()) {
                // Without a descriptor left the connection stays where it is, and the listener ready.
                std::array<pollfd, 1> nothing{};
                os::pollWithin(nothing, limit, os::Deadline::after(Rest));
                continue;
            }
            m_channels.push_back({std::move(socket), rpc::RecordReader(LongestRecord)});
            if (m_channels.size() > MaxChannels)
                m_channels.pop_front();
        }
    } catch (const std::bad_alloc &) {
        return; // no more requests; the session goes on
    }
}

/// False when the channel is at its end.
bool Vxi11Interrupt::receive(Channel &channel)
{
    std::array<std::byte, 1024> piece;
    const os::Transfer got = channel.socket.receiveNow(piece);
    if (got.result != IoResult::Done)
        return false;
    xdr::Bytes bytes = std::span(piece).first(got.count);
    while (!bytes.empty()) {
        bytes = bytes.subspan(channel.records.feed(bytes));
        if (channel.records.state() == rpc::RecordReader::State::Refused)
            return false;
        if (channel.records.state() == rpc::RecordReader::State::Complete) {
            take(channel);
            channel.records.next();
        }
    }
    return true;
}

void Vxi11Interrupt::take(Channel &channel)
{
    const xdr::Bytes record = channel.records.record();
    const xdr::Bytes wanted = handle();
    if (std::search(record.begin(), record.end(), wanted.begin(), wanted.end()) != record.end()) {
        std::function<void()> notify;
        {
            const std::lock_guard lock(m_mutex);
            notify = m_notify;
        }
        if (notify)
            notify();
    }
    xdr::Reader reader(record);
    rpc::Call call;
    if (rpc::decode(reader, call) != rpc::CallForm::Good)
        return;
    std::vector<std::byte> reply;
    xdr::Writer writer(reply);
    const std::size_t begun = rpc::beginRecord(writer);
    rpc::encode(writer, rpc::success(call.xid));
    rpc::finishRecord(writer, begun);
    std::array pieces = {iovec{reply.data(), reply.size()}};
    channel.socket.send(pieces, {os::Deadline::now(), m_stop});
}

} // namespace kyvisa
