#pragma once

#include "simulator/instrument/Response.h"
#include "simulator/traffic/MessageText.h"

#include <chrono>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace simulator
{

/**
 * What the clients and the instrument say to each other, for those who watch. A server makes a Client for each of its clients and lends it to
 * the message exchange and the lock table, which tell it what passes:
 *
 *     TrafficLog::Client m_traffic{instrument.traffic, "socket", connection.peer()};
 *     m_exchange.setTraffic(&m_traffic);
 *     m_lockOwner = instrument.locks.join(changed, &m_traffic);
 *
 * While nobody watches, telling it costs a comparison.
 */
class TrafficLog
{
public:
    enum class Kind : std::uint8_t { ToInstrument, FromInstrument, Event };

    /// Valid during the call.
    struct Entry {
        std::chrono::system_clock::time_point time;
        Kind kind;
        std::string_view protocol;
        std::string_view client;
        std::string_view text; ///< one line of printable ASCII
    };

    class Watcher
    {
    public:
        /// Must not talk to the instrument.
        virtual void seen(const Entry &entry) = 0;

    protected:
        ~Watcher() = default;
    };

    /// One client's part of it, for as long as it is connected.
    class Client
    {
    public:
        Client(TrafficLog &log, std::string protocol, std::string name);
        ~Client();
        Client(const Client &) = delete;
        Client &operator=(const Client &) = delete;

        const std::string &protocol() const { return m_protocol; }
        const std::string &name() const { return m_name; }
        std::uint64_t messages() const { return m_messages; }

        /// Bytes of a program message.
        void received(std::span<const std::byte> bytes);
        /// Bytes of a block in it, which went straight to their place.
        void blockReceived(std::size_t count);
        void messageEnds();
        /// What has come of a message counts no more.
        void forget();
        void answered(const ResponseSegments &response);
        void event(std::string_view what);
        void event(std::string_view what, std::uint8_t statusByte);
        /// "lock exclusive: granted"; an empty @p key is that of the exclusive lock.
        void lock(std::string_view what, std::string_view key, std::string_view outcome);

    private:
        void tell(Kind kind, std::string_view text) const;

        TrafficLog &m_log;
        const std::string m_protocol;
        const std::string m_name;
        std::uint64_t m_messages = 0;
        MessageText m_message;
    };

    bool isWatched() const { return !m_watchers.empty(); }
    void add(Watcher &watcher) { m_watchers.push_back(&watcher); }
    void remove(Watcher &watcher) { std::erase(m_watchers, &watcher); }
    /// In the order in which they came.
    const std::vector<const Client *> &clients() const { return m_clients; }

private:
    std::vector<Watcher *> m_watchers;
    std::vector<const Client *> m_clients;
};

} // namespace simulator
