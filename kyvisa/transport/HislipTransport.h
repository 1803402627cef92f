#pragma once

#include "kyvisa/core/ResourceName.h"
#include "kyvisa/transport/HislipAsyncChannel.h"
#include "kyvisa/transport/HislipChannel.h"
#include "kyvisa/transport/Transport.h"

#include <memory>

namespace kyvisa
{

class AttributeStore;

/**
 * HiSLIP (IVI-6.1), protocol 1.0, synchronized and overlapped mode.
 *
 * In synchronized mode each message that goes out has an id, and a response counts only when it carries the id of the last
 * one: what was asked before, timed out or was interrupted is dropped on arrival. In overlapped mode responses are kept in
 * order until they are read.
 *
 * The synchronous connection belongs to the calling thread. See HislipAsyncChannel for the other one.
 */
class HislipTransport : public Transport
{
public:
    /// Opens both connections and agrees on the sizes of messages.
    static ViStatus connect(const ResourceName &name, const os::WaitLimit &limit, AttributeStore &attributes,
                            std::unique_ptr<Transport> &transport);

    HislipTransport(HislipChannel sync, std::unique_ptr<HislipAsyncChannel> async, bool overlapped);

    ViStatus read(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                  std::size_t &count) override;
    ViStatus write(std::span<const std::byte> data, const TransferMode &mode, const os::WaitLimit &limit,
                   std::size_t &count) override;
    ViStatus readStatusByte(const TransferMode &mode, const os::WaitLimit &limit, ViUInt16 &status) override;
    ViStatus trigger(const TransferMode &mode, const os::WaitLimit &limit) override;
    ViStatus clear(const os::WaitLimit &limit) override;
    ViStatus controlRemote(ViUInt16 mode, const os::WaitLimit &limit) override;
    ViStatus applyAttribute(ViAttr attribute, ViUInt64 value, const os::WaitLimit &limit) override;
    ViStatus watchServiceRequests(std::function<void()> notify) override;
    bool deviceHasLocks() const override { return true; }
    void close() override;
    void abandon() override;

private:
    ViStatus agreeOnSizes(ViUInt64 largestToUs, const os::WaitLimit &limit);
    ViStatus clearInto(bool overlapped, const os::WaitLimit &limit);
    ViStatus nextData(std::size_t &count, const os::WaitLimit &limit);
    ViStatus deliver(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                     std::size_t &count);
    ViStatus beforeSending(const os::WaitLimit &limit);
    ViStatus refuse(const wire::hislip::Header &header, const os::WaitLimit &limit);
    ViStatus ended(os::IoResult result, const os::WaitLimit &limit);
    ViStatus checked(ViStatus status);

    std::uint32_t lastSentId() const { return m_nextId - 2; }
    std::uint32_t takeNextId();
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
    unsigned m_interruptions = 0; ///< Interrupted messages; each has a counterpart on the other connection
};

} // namespace kyvisa
