#pragma once

#include "simulator/instrument/LockTable.h"

#include <cstdint>
#include <functional>
#include <optional>
#include <string_view>
#include <utility>

namespace wire::hislip
{
struct Header;
}

namespace simulator
{

class HislipChannel;
class Instrument;

/**
 * Locks and remote/local of a HiSLIP client: its place in the lock table, and the transactions of the asynchronous channel that change it.
 *
 * A release and a change of remote/local name the last message that the client sent, and take effect behind it: completed() says how far the synchronous
 * channel is, cleared() that it will get no further.
 */
class HislipControl
{
public:
    /// @p changed is called when the locks have changed.
    HislipControl(Instrument &instrument, HislipChannel &async, std::function<void()> changed,
                  TrafficLog::Client &traffic);
    ~HislipControl();
    HislipControl(const HislipControl &) = delete;
    HislipControl &operator=(const HislipControl &) = delete;

    /// False while another client's lock shuts this one out.
    bool allowed() const;
    void lock(const wire::hislip::Header &header, std::string_view key);
    void lockInfo();
    void remoteLocal(const wire::hislip::Header &header);

    void completed(std::uint32_t messageId);
    /// A device clear has begun: nothing waits any longer.
    void cleared();
    /// And it has ended: ids are counted anew.
    void restart();
    /// The client has gone: what it holds is free.
    void leave();

private:
    bool isComplete(std::uint32_t messageId) const;
    void unlock();
    void change(std::uint8_t request);

    Instrument &m_instrument;
    HislipChannel &m_async;
    LockTable::Owner m_owner;
    std::uint32_t m_completed; ///< id of the last message that was dealt with
    std::optional<std::uint32_t> m_unlockAfter;
    std::optional<std::pair<std::uint32_t, std::uint8_t>> m_changeAfter;
};

} // namespace simulator
