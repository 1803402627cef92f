#pragma once

#include "kyvisa/include/visatype.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <span>
#include <string>

namespace kyvisa
{

namespace os
{
struct WaitLimit;
}
class AttributeStore;
class GpibController;

/// What ends a read, and the protocol of status and trigger.
struct TransferMode {
    bool termCharEnabled = false;
    ViUInt8 termChar = '\n';
    bool suppressEnd = false;
    bool sendEnd = true;
    ViUInt16 protocol = 1; ///< VI_ATTR_IO_PROT
};

/// Which locks an instrument keeps itself, so that they hold for clients of other machines too.
enum class DeviceLocks : std::uint8_t {
    None,      ///< none: the library's own locks hold on this machine
    Exclusive, ///< the exclusive one; it is taken on top of the library's own
    All,       ///< exclusive and shared ones, and it enforces them
};

/**
 * One connection to one instrument, in one protocol.
 *
 * The session calls one operation at a time, each with the limit that may end it, and close() when none is inside. Every
 * operation answers a status of the VISA interface. After VI_ERROR_CONN_LOST the connection is gone and every further
 * operation answers the same.
 */
class Transport
{
public:
    virtual ~Transport() = default;

    /// @param count receives the bytes read, also on errors.
    virtual ViStatus read(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                          std::size_t &count) = 0;
    /// @param count receives the bytes sent, also on errors.
    virtual ViStatus write(std::span<const std::byte> data, const TransferMode &mode, const os::WaitLimit &limit,
                           std::size_t &count) = 0;
    virtual ViStatus readStatusByte(const TransferMode &mode, const os::WaitLimit &limit, ViUInt16 &status) = 0;
    virtual ViStatus trigger(const TransferMode &mode, const os::WaitLimit &limit) = 0;
    virtual ViStatus clear(const os::WaitLimit &limit) = 0;
    /// @param mode a mode of viGpibControlREN, checked.
    virtual ViStatus controlRemote(ViUInt16 mode, const os::WaitLimit &limit);

    /// Carries out a new value of an attribute that means something to the connection, before it is stored.
    virtual ViStatus applyAttribute(ViAttr attribute, ViUInt64 value, const os::WaitLimit &limit);

    /// The attribute's value is the instrument's: it is asked each time.
    virtual bool isLive(ViAttr attribute) const;
    /// Asks for a live attribute.
    virtual ViStatus readAttribute(ViAttr attribute, const os::WaitLimit &limit, ViUInt64 &value);
    /// viFlush() of the system's buffers. @param mask VI_IO_IN_BUF, VI_IO_OUT_BUF and their _DISCARD.
    virtual ViStatus flushLine(ViUInt16 mask, const os::WaitLimit &limit);
    /// viSetBuf() of the system's buffers. @param mask VI_IO_IN_BUF and VI_IO_OUT_BUF. @param size in bytes, not 0.
    /// @return VI_WARN_NSUP_BUF where their size is nobody's to set.
    virtual ViStatus resizeLine(ViUInt16 mask, std::size_t size);

    /// What a session on a GPIB interface can do beside transfers; nullptr for everything else.
    virtual GpibController *gpibController() { return nullptr; }

    /// From now on @p notify is called, on a thread of the transport, for each service request. May be called again.
    virtual ViStatus watchServiceRequests(std::function<void()> notify, const os::WaitLimit &limit);

    virtual DeviceLocks deviceLocks() const { return DeviceLocks::None; }
    /**
     * Asks the instrument for the exclusive lock (empty @p key) or a shared one, and lets it wait up to @p patience for that.
     * VI_ERROR_RSRC_LOCKED when another client held it all the time. @p limit leaves time for the way there and back; a call
     * that it ends sees to it that a lock which is granted too late is given back.
     *
     * Only asked for what the session does not hold yet.
     */
    virtual ViStatus lockDevice(const std::string &key, std::chrono::milliseconds patience, const os::WaitLimit &limit);
    /// Gives back the exclusive lock, or when the session has none the shared one.
    virtual ViStatus unlockDevice(const os::WaitLimit &limit);
    /// What the instrument's clients hold. @param state VI_NO_LOCK, VI_EXCLUSIVE_LOCK or VI_SHARED_LOCK.
    virtual ViStatus readLockState(const os::WaitLimit &limit, ViAccessMode &state);

    virtual void close() = 0;
    /// Instead of close() in a forked child: frees descriptors, tells nobody, takes no lock.
    virtual void abandon() = 0;
};

} // namespace kyvisa
