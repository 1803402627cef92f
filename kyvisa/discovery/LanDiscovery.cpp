#include "kyvisa/discovery/LanDiscovery.h"

#include "kyvisa/core/Trace.h"
#include "kyvisa/discovery/HostCollection.h"
#include "kyvisa/discovery/HttpGet.h"
#include "kyvisa/discovery/MdnsQuery.h"
#include "kyvisa/discovery/TaskPool.h"
#include "kyvisa/discovery/Vxi11Probe.h"
#include "kyvisa/discovery/Vxi11Query.h"
#include "kyvisa/os/Poll.h"

#include <arpa/inet.h>
#include <array>
#include <memory>
#include <mutex>
#include <utility>

namespace kyvisa
{
namespace
{

constexpr std::size_t MostThreads = 16;
constexpr std::size_t MostHosts = 4096;
constexpr std::size_t LargestDocument = std::size_t{256} << 10;
constexpr std::chrono::milliseconds LongestForDocument{2000};
constexpr std::uint16_t WebPort = 80;
constexpr std::uint16_t AskPortmapper = 0;

/// One search. The queries run on the caller's thread, the tasks on others; the hosts belong to both.
class Search
{
public:
    Search(const DiscoveryMethods &methods, const os::WaitLimit &limit)
        : m_methods(methods), m_limit(limit), m_interfaces(os::networkInterfaces())
    {
        if (methods.vxi11)
            m_queries.push_back(std::make_unique<Vxi11Query>(
                m_interfaces, [this](const std::string &host, std::uint16_t port) { foundVxi11(host, port); }));
        if (methods.mdns)
            m_queries.push_back(std::make_unique<MdnsQuery>(
                m_interfaces, [this](const Announcement &announcement) { announced(announcement); }));
    }

    std::vector<FoundResource> run()
    {
        const bool heard = listen();
        m_tasks.finish();
        auto found = heard ? resourcesOf(m_hosts) : std::vector<FoundResource>();
        if (trace::isOn())
            tell(found.size());
        return found;
    }

private:
    /// Who finds nothing wants to know where it was looked for.
    void tell(std::size_t resources) const
    {
        std::string line = "search by ";
        line += m_methods.vxi11 ? "VXI-11" : "";
        line += m_methods.vxi11 && m_methods.mdns ? " and " : "";
        line += m_methods.mdns ? "mDNS" : "";
        if (m_interfaces.empty()) {
            trace::tell(line + ": no network interface is up");
            return;
        }
        const char *between = " on ";
        for (const os::NetworkInterface &interface : m_interfaces) {
            std::array<char, INET_ADDRSTRLEN> address{};
            ::inet_ntop(AF_INET, &interface.address, address.data(), address.size());
            line += std::exchange(between, ", ");
            line += address.data();
        }
        const auto counted = [](std::size_t number, const char *what) {
            return std::to_string(number) + " " + what + (number == 1 ? "" : "s");
        };
        trace::tell(line + ": " + counted(m_hosts.size(), "host") + " answered, " + counted(resources, "resource"));
    }

    /// @return false when another thread ended it.
    bool listen()
    {
        struct Asking {
            LanQuery *query;
            os::Deadline due;
        };
        std::vector<Asking> pending;
        for (const auto &query : m_queries)
            for (const std::chrono::milliseconds when : query->schedule())
                pending.push_back({query.get(), os::Deadline::after(when)});
        for (;;) {
            os::Deadline next = os::Deadline::never();
            std::erase_if(pending, [&](const Asking &asking) {
                const bool isDue = asking.due.expired();
                if (isDue)
                    asking.query->ask();
                else
                    next = next.orEarlier(asking.due);
                return isDue;
            });
            switch (collect(next)) {
            case os::IoResult::Done:
                break;
            case os::IoResult::TimedOut:
                return true;
            default:
                return false;
            }
        }
    }

    os::IoResult collect(os::Deadline atLatest)
    {
        std::vector<pollfd> watched;
        for (const auto &query : m_queries)
            for (std::size_t socket = 0; socket < query->socketCount(); ++socket)
                watched.push_back({query->descriptor(socket), POLLIN, 0});
        if (watched.empty())
            return os::IoResult::TimedOut;
        watched.emplace_back();
        const os::IoResult result = os::pollWithin(watched, m_limit, atLatest);
        if (result != os::IoResult::Done)
            return result;
        std::size_t index = 0;
        for (const auto &query : m_queries)
            for (std::size_t socket = 0; socket < query->socketCount(); ++socket)
                if (watched[index++].revents != 0)
                    query->collect(socket);
        return result;
    }

    void foundVxi11(const std::string &address, std::uint16_t port)
    {
        {
            const std::lock_guard lock(m_mutex);
            FoundHost *host = hostAt(address);
            if (!host || std::exchange(host->vxi11Asked, true))
                return;
        }
        m_tasks.add([this, address, port] {
            const std::string device = probeVxi11(address, port, m_limit);
            if (device.empty())
                return;
            {
                const std::lock_guard lock(m_mutex);
                m_hosts[address].vxi11Device = device;
            }
            readDocument(address, WebPort);
        });
    }

    void announced(const Announcement &announcement)
    {
        using Service = Announcement::Service;
        {
            const std::lock_guard lock(m_mutex);
            FoundHost *host = hostAt(announcement.address);
            if (!host)
                return;
            if (announcement.service == Service::Hislip)
                host->hislipPort = announcement.port;
            if (announcement.service == Service::RawSocket)
                host->socketPort = announcement.port;
            fillIn(host->announced, announcement.texts);
        }
        // What stands beside VXI-11 is its portmapper's port, or its own: whoever knows asks the portmapper.
        if (announcement.service == Service::Vxi11)
            foundVxi11(announcement.address, AskPortmapper);
        if (announcement.service == Service::Lxi)
            m_tasks.add(
                [this, address = announcement.address, port = announcement.port] { readDocument(address, port); });
    }

    /// On a task's thread. A host without the document is an instrument all the same.
    void readDocument(const std::string &address, std::uint16_t port)
    {
        {
            const std::lock_guard lock(m_mutex);
            if (!m_hosts[address].documentPorts.insert(port).second)
                return;
        }
        const os::WaitLimit patience{m_limit.deadline.orEarlier(os::Deadline::after(LongestForDocument)),
                                     m_limit.wakeup};
        const auto text = httpGet(address, port, "/lxi/identification", LargestDocument, patience);
        std::optional<LxiDocument> document = text ? readLxiDocument(*text) : std::nullopt;
        if (!document)
            return;
        const std::lock_guard lock(m_mutex);
        m_hosts[address].document = *std::move(document);
    }

    /// Under the lock. Nothing once there are too many: somebody may answer in the name of the whole network.
    FoundHost *hostAt(const std::string &address)
    {
        const auto found = m_hosts.find(address);
        if (found != m_hosts.end())
            return &found->second;
        return m_hosts.size() < MostHosts ? &m_hosts[address] : nullptr;
    }

    const DiscoveryMethods m_methods;
    const os::WaitLimit m_limit;
    const std::vector<os::NetworkInterface> m_interfaces;
    std::mutex m_mutex;
    FoundHosts m_hosts;
    std::vector<std::unique_ptr<LanQuery>> m_queries;
    TaskPool m_tasks{MostThreads};
};

} // namespace

std::vector<FoundResource> discoverLan(const DiscoveryMethods &methods, const os::WaitLimit &limit)
{
    return methods.any() ? Search(methods, limit).run() : std::vector<FoundResource>();
}

} // namespace kyvisa
