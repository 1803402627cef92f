#pragma once

#include "kyvisa/transport/HislipAsyncChannel.h"
#include "kyvisa/transport/HislipChannel.h"
#include "kyvisa/transport/Transport.h"

#include <memory>
#include <optional>

namespace kyvisa
{

/**
 * HiSLIP (IVI-6.1), protocol 1.0, synchronized and overlapped mode.
 *
 * In synchronized mode each message that goes out has an id, and a response counts only when it carries the id of the last
 * one: what was asked before, timed out or was interrupted is dropped on arrival. In overlapped mode responses are kept in
 * order until they are read.
 *
 * A device clear that ran into its time-out is finished before anything else is sent or read: until the instrument has seen
 * its end, it discards what comes. An instrument that does not do its part within a minute has lost the connection.
 *
 * The synchronous connection belongs to the calling thread. See HislipAsyncChannel for the other one.
 */
class HislipTransport : public Transport
{
public:
    /// @param patienceForClear from the beginning of a device clear to its end; IVI-6.1 suggests 40 to 120 seconds.
    HislipTransport(HislipChannel sync, std::unique_ptr<HislipAsyncChannel> async, bool overlapped,
                    std::chrono::milliseconds patienceForClear = std::chrono::seconds(60));

    /// Keeps VI_ATTR_TCPIP_HISLIP_OVERLAP_EN true from now on. @p attributes outlives this object.
    void showModeIn(AttributeStore &attributes);

    /// Tells each other the largest message.
    ViStatus agreeOnSizes(ViUInt64 largestToUs, const os::WaitLimit &limit);

    ViStatus read(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                  std::size_t &count) override;
    ViStatus write(std::span<const std::byte> data, const TransferMode &mode, const os::WaitLimit &limit,
                   std::size_t &count) override;
    ViStatus readStatusByte(const TransferMode &mode, const os::WaitLimit &limit, ViUInt16 &status) override;
    ViStatus trigger(const TransferMode &mode, const os::WaitLimit &limit) override;
    ViStatus clear(const os::WaitLimit &limit) override;
    ViStatus controlRemote(ViUInt16 mode, const os::WaitLimit &limit) override;
    ViStatus applyAttribute(ViAttr attribute, ViUInt64 value, const os::WaitLimit &limit) override;
    ViStatus flushLine(ViUInt16 mask, const os::WaitLimit &limit) override;
    ViStatus resizeLine(ViUInt16 mask, std::size_t size) override;
    ViStatus watchServiceRequests(std::function<void()> notify, const os::WaitLimit &limit) override;
    DeviceLocks deviceLocks() const override { return DeviceLocks::All; }
    ViStatus lockDevice(const std::string &key, std::chrono::milliseconds patience,
                        const os::WaitLimit &limit) override;
    ViStatus unlockDevice(const os::WaitLimit &limit) override;
    ViStatus readLockState(const os::WaitLimit &limit, ViAccessMode &state) override;
    void close() override;
    void abandon() override;

private:
    /// How far a device clear has come.
    enum class Clearing { No, Requested, Acknowledged, Completed };

    ViStatus clearInto(bool overlapped, const os::WaitLimit &limit);
    os::IoResult finishAsFarAsTaken(const os::WaitLimit &limit);
    ViStatus finishClear(const os::WaitLimit &limit);
    ViStatus goOnWithClear(const os::WaitLimit &limit);
    ViStatus whileClearing(ViStatus status);
    void cleared(bool overlapped);
    ViStatus readResponse(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                          std::size_t &count);
    bool lockedByAnother(const os::Wakeup &wakeup);
    ViStatus nextData(std::size_t &count, const os::WaitLimit &limit);
    void responseMessageTaken();
    ViStatus deliver(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                     std::size_t &count);
    ViStatus beforeSending(const os::WaitLimit &limit);
    ViStatus refuse(const wire::hislip::Header &header, const os::WaitLimit &limit);
    ViStatus ended(os::IoResult result, const os::WaitLimit &limit);
    ViStatus checked(ViStatus status);

    std::uint32_t lastSentId() const { return m_nextId - 2; }
    os::IoResult sendNumbered(wire::hislip::MessageType type, std::span<const std::byte> payload,
                              const os::WaitLimit &limit, std::size_t &sent);
    std::uint8_t takeDeliveredFlag();

    HislipChannel m_sync;
    std::unique_ptr<HislipAsyncChannel> m_async;
    std::uint64_t m_largestPayload = 0; ///< that the instrument takes in one message
    bool m_overlapped;

    std::uint32_t m_nextId = wire::hislip::FirstMessageId;
    std::uint32_t m_lastDeliveredId = wire::hislip::NothingSentId;
    bool m_deliveredToReport =
        false;                  ///< the caller has got the end of a response, and the instrument does not know yet
    bool m_inMessage = false;   ///< between the header of a response's message and its last byte
    bool m_messageEnds = false; ///< that message carries the END
    std::uint32_t m_messageId = 0;

    std::optional<std::uint32_t>
        m_interrupted; ///< Interrupted has come; its counterpart on the other connection has not
    os::Deadline m_counterpartDue = os::Deadline::never();
    Clearing m_clearing = Clearing::No;
    bool m_clearIntoOverlap = false;
    const std::chrono::milliseconds m_patienceForClear;
    os::Deadline m_clearDue = os::Deadline::never();
    AttributeStore *m_attributes = nullptr;

    bool m_holdsExclusive = false; ///< of the instrument's locks
    bool m_holdsShared = false;
    bool m_tellsLocks = true; ///< as far as is known, the instrument answers AsyncLockInfo
};

} // namespace kyvisa
