#pragma once

#include "kyvisa/include/visatype.h"

#include <cstddef>
#include <functional>
#include <span>

namespace kyvisa
{

namespace os
{
struct WaitLimit;
}
class AttributeStore;

/// What ends a read, and the protocol of status and trigger.
struct TransferMode {
    bool termCharEnabled = false;
    ViUInt8 termChar = '\n';
    bool suppressEnd = false;
    bool sendEnd = true;
    ViUInt16 protocol = 1; ///< VI_ATTR_IO_PROT
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

    /// From now on @p notify is called, on a thread of the transport, for each service request. May be called again.
    virtual ViStatus watchServiceRequests(std::function<void()> notify);

    /// The instrument has locks of its own, so blocked operations wait for the time-out before they give up.
    virtual bool deviceHasLocks() const { return false; }

    virtual void close() = 0;
    /// Instead of close() in a forked child: frees descriptors, tells nobody, takes no lock.
    virtual void abandon() = 0;
};

} // namespace kyvisa
