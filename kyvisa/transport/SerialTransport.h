#pragma once

#include "kyvisa/os/SerialPort.h"
#include "kyvisa/transport/SerialInput.h"
#include "kyvisa/transport/Transport.h"

#include <memory>

namespace kyvisa
{

struct ResourceName;

/**
 * A serial port. What ends a message is agreed on by attributes: VI_ATTR_ASRL_END_IN for reading, VI_ATTR_ASRL_END_OUT for
 * writing.
 *
 * As on a raw socket, nothing tells a late answer from the next one: once a read has timed out, whatever has arrived by the
 * next write or clear is dropped before that goes out.
 */
class SerialTransport : public Transport
{
public:
    /// Opens the port for this session alone: VI_ERROR_RSRC_BUSY when somebody else has it.
    static ViStatus connect(const ResourceName &name, std::unique_ptr<Transport> &transport);

    explicit SerialTransport(os::SerialPort port);

    ViStatus read(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                  std::size_t &count) override;
    ViStatus write(std::span<const std::byte> data, const TransferMode &mode, const os::WaitLimit &limit,
                   std::size_t &count) override;
    ViStatus readStatusByte(const TransferMode &mode, const os::WaitLimit &limit, ViUInt16 &status) override;
    ViStatus trigger(const TransferMode &mode, const os::WaitLimit &limit) override;
    ViStatus clear(const os::WaitLimit &limit) override;
    ViStatus applyAttribute(ViAttr attribute, ViUInt64 value, const os::WaitLimit &limit) override;
    bool isLive(ViAttr attribute) const override;
    ViStatus readAttribute(ViAttr attribute, const os::WaitLimit &limit, ViUInt64 &value) override;
    ViStatus flushLine(ViUInt16 mask, const os::WaitLimit &limit) override;
    void close() override;
    void abandon() override;

private:
    ViStatus ended(os::IoResult result, const os::WaitLimit &limit);
    bool configure(const os::SerialSettings &settings);
    ViStatus fill(const os::WaitLimit &limit);
    ViStatus takeError();
    bool endsAt(std::byte byte, const TransferMode &mode) const;
    ViStatus send(std::span<const std::byte> data, const TransferMode &mode, const os::WaitLimit &limit,
                  std::size_t &count);
    ViStatus sendMarked(std::span<const std::byte> data, bool markLast, const os::WaitLimit &limit, std::size_t &count);
    void dropInput();
    std::byte topBit() const;

    os::SerialPort m_port;
    os::SerialSettings m_settings;
    os::SerialErrors m_errors; ///< that were told, or were there before
    SerialInput m_input;
    ViUInt16 m_endIn;
    ViUInt16 m_endOut;
    bool m_overrun = false;
    bool m_answerMayBeLate = false;
    bool m_messageStopped = false; ///< the last write ended early: nobody misses what of it is still to leave
};

} // namespace kyvisa
