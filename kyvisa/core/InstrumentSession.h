#pragma once

#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/core/EventHub.h"
#include "kyvisa/core/IoGate.h"
#include "kyvisa/core/Object.h"
#include "kyvisa/core/ResourceName.h"
#include "kyvisa/os/Wakeup.h"

#include <atomic>
#include <cstddef>
#include <memory>
#include <span>

namespace kyvisa
{

class Library;
class ResourceLocks;
class Transport;
struct TransferMode;
namespace os
{
struct WaitLimit;
}

/**
 * A session on an instrument: attributes, locks, events, and the connection.
 *
 * A transfer takes these steps: fix the deadline; see that no other session's lock is in the way; wait for the session's
 * turn; talk; give the turn back. close() may come at any of them from another thread: it raises the wake-up, waits until
 * the turn is free, then closes the connection. The object itself lives until the last call has left it.
 *
 * The session is in the handle table before it is connected, so that closing its resource manager ends viOpen as well.
 */
class InstrumentSession : public Object
{
public:
    /// @param sessionKind from sessionKind(); not 0.
    InstrumentSession(Library &library, const ResourceName &name, std::uint16_t sessionKind, ViSession resourceManager);
    ~InstrumentSession() override;

    /// Connects, then takes an exclusive lock when @p accessMode asks for it.
    ViStatus open(ViSession handle, ViAccessMode accessMode, ViUInt32 timeout);

    ViStatus read(std::span<std::byte> buffer, std::size_t &count);
    ViStatus write(std::span<const std::byte> data, std::size_t &count);
    ViStatus readStatusByte(ViUInt16 &status);
    ViStatus assertTrigger(ViUInt16 protocol);
    ViStatus clear();
    /// Carried out before the call returns; the completion is posted as an event.
    ViStatus readAsync(std::span<std::byte> buffer, ViJobId &job);
    ViStatus writeAsync(std::span<const std::byte> data, ViJobId &job);
    ViStatus controlRemote(ViUInt16 mode);
    ViStatus terminate(ViUInt16 degree, ViJobId job);

    ViStatus lock(ViAccessMode type, ViUInt32 timeout, const ViChar *requestedKey, ViChar *accessKey);
    ViStatus unlock();

    ViStatus enableEvent(ViEventType type, ViUInt16 mechanism, ViEventFilter filter);
    EventHub &events() { return *m_events; }

    ViStatus getAttribute(ViAttr attribute, void *value) override;
    ViStatus setAttribute(ViAttr attribute, ViAttrState value) override;
    ViStatus close() override;
    void abandon() override;
    InstrumentSession *asInstrument() override { return this; }

private:
    template <typename Operation>
    ViStatus perform(const Operation &operation);
    template <typename Operation>
    ViStatus inTurn(os::Deadline deadline, const Operation &operation);
    ViStatus mayTransfer(os::Deadline deadline);
    ViStatus enterGate(os::Deadline deadline);
    TransferMode transferMode() const;
    void describe(const ResourceName &name, ViSession resourceManager);

    const ResourceName m_name;
    AttributeStore m_attributes;
    const std::shared_ptr<ResourceLocks> m_locks;
    const std::shared_ptr<EventHub> m_events;
    std::unique_ptr<Transport> m_transport; ///< belongs to whoever has the turn
    os::Wakeup m_wakeup;
    IoGate m_gate;
    std::atomic<ViJobId> m_lastJob{0};
    std::atomic<unsigned> m_terminations{0}; ///< tells a wait that began before viTerminate from one that began after
    std::atomic<bool> m_opened{false};
    std::atomic<bool> m_closing{false};
};

} // namespace kyvisa
