#pragma once

#include "kyvisa/core/AsyncTransfers.h"
#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/core/EventHub.h"
#include "kyvisa/core/FormattedIo.h"
#include "kyvisa/core/Interruptions.h"
#include "kyvisa/core/IoGate.h"
#include "kyvisa/core/Object.h"
#include "kyvisa/core/ResourceName.h"
#include "kyvisa/core/SessionLocks.h"
#include "kyvisa/os/Wakeup.h"

#include <atomic>
#include <cstddef>
#include <memory>
#include <span>

namespace kyvisa
{

/// Of viOpen with a time-out of 0, in milliseconds.
constexpr ViUInt32 DefaultOpenTimeout = 2000;

class Library;
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
    /// @param connectBy leaves the connection less time than @p timeout.
    ViStatus open(ViSession handle, ViAccessMode accessMode, ViUInt32 timeout, os::Deadline connectBy);

    ViStatus read(std::span<std::byte> buffer, std::size_t &count);
    ViStatus write(std::span<const std::byte> data, std::size_t &count);
    FormattedIo &formatted() { return m_formatted; }

    // For operations that consist of several transfers.
    /// When an operation that begins now has to be over.
    os::Deadline operationDeadline() const;
    /// VI_SUCCESS when no lock of another session is in the way.
    ViStatus mayTransfer();
    ViStatus read(std::span<std::byte> buffer, std::size_t &count, os::Deadline deadline);
    /// @param end false: no END goes with the last byte, whatever VI_ATTR_SEND_END_EN says.
    ViStatus write(std::span<const std::byte> data, std::size_t &count, os::Deadline deadline, bool end);
    const AttributeStore &attributes() const { return m_attributes; }
    void setBufferSize(ViAttr attribute, std::size_t size) { m_attributes.setNumber(attribute, size); }

    ViStatus readStatusByte(ViUInt16 &status);
    ViStatus assertTrigger(ViUInt16 protocol);
    ViStatus clear();
    /// Begin a transfer whose end VI_EVENT_IO_COMPLETION tells. @param job receives its number before it begins; may be null.
    ViStatus readAsync(std::span<std::byte> buffer, ViJobId *job);
    ViStatus writeAsync(std::span<const std::byte> data, ViJobId *job);
    ViStatus controlRemote(ViUInt16 mode);
    // On GPIB interfaces alone.
    ViStatus controlAttention(ViUInt16 mode);
    ViStatus clearInterface();
    ViStatus sendCommands(std::span<const std::byte> commands, std::size_t &count);
    ViStatus passControl(ViUInt16 primary, ViUInt16 secondary);
    /// viFlush() of the system's buffers.
    ViStatus flushLine(ViUInt16 mask);
    /// viSetBuf() of the system's buffers.
    ViStatus resizeLine(ViUInt16 mask, std::size_t size);
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
    ViStatus perform(os::Deadline deadline, const Operation &operation);
    template <typename Operation>
    ViStatus inTurn(os::Deadline deadline, const CallWatch &watch, const Operation &operation);
    ViStatus entered(IoGate::Entered entered, const CallWatch &watch);
    ViStatus startJob(bool reads, std::span<std::byte> buffer, ViJobId *job);
    ViStatus carryOut(const AsyncTransfers::Job &job, const std::atomic<bool> &cancelled, std::size_t &count);
    ViStatus transfer(std::span<const std::byte> data, bool end, const os::WaitLimit &limit, std::size_t &count);
    TransferMode transferMode() const;
    bool isInterface() const; ///< a GPIB interface, not an instrument

    const ResourceName m_name;
    AttributeStore m_attributes;
    Interruptions m_interruptions;
    SessionLocks m_locks;
    const std::shared_ptr<EventHub> m_events;
    std::unique_ptr<Transport> m_transport; ///< belongs to whoever has the turn
    os::Wakeup m_wakeup;
    IoGate m_gate;
    FormattedIo m_formatted{*this};
    std::atomic<bool> m_opened{false};
    AsyncTransfers m_jobs; ///< last: its thread uses all the others
};

} // namespace kyvisa
