#include "kyvisa/transport/SerialTransport.h"

#include "kyvisa/core/ResourceName.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/SerialPorts.h"
#include "kyvisa/transport/IoStatus.h"
#include "kyvisa/transport/StringProtocol.h"

#include <algorithm>
#include <array>

namespace kyvisa
{
namespace
{

using os::SerialLine;

ViUInt64 stateOf(std::optional<bool> line)
{
    if (!line)
        return static_cast<ViUInt64>(VI_STATE_UNKNOWN);
    return *line ? VI_STATE_ASSERTED : VI_STATE_UNASSERTED;
}

os::SerialStop stopBits(ViUInt64 value)
{
    if (value == VI_ASRL_STOP_ONE5)
        return os::SerialStop::OneAndAHalf;
    return value == VI_ASRL_STOP_TWO ? os::SerialStop::Two : os::SerialStop::One;
}

/// The device file; empty when there is no such port.
std::string pathOf(const ResourceName &name)
{
    if (!name.address.empty())
        return name.address;
    const std::vector<std::string> ports = os::serialPorts();
    return name.board >= 1 && name.board <= ports.size() ? ports[name.board - 1u] : std::string();
}

} // namespace

ViStatus SerialTransport::connect(const ResourceName &name, std::unique_ptr<Transport> &transport)
{
    const std::string path = pathOf(name);
    if (path.empty())
        return VI_ERROR_RSRC_NFOUND;
    os::SerialPort port;
    switch (port.open(path)) {
    case os::SerialPort::Opened::Done:
        break;
    case os::SerialPort::Opened::Absent:
        return VI_ERROR_RSRC_NFOUND;
    case os::SerialPort::Opened::Busy:
        return VI_ERROR_RSRC_BUSY;
    case os::SerialPort::Opened::Denied:
        return VI_ERROR_NPERMISSION;
    }
    auto serial = std::make_unique<SerialTransport>(std::move(port));
    if (!serial->configure(os::SerialSettings{}))
        return VI_ERROR_INV_SETUP;
    serial->m_port.setLine(SerialLine::Dtr, true); // pseudo terminals have none
    serial->m_port.setLine(SerialLine::Rts, true);
    serial->dropInput();
    transport = std::move(serial);
    return VI_SUCCESS;
}

SerialTransport::SerialTransport(os::SerialPort port)
    : m_port(std::move(port)), m_errors(m_port.errors().value_or(os::SerialErrors{})), m_endIn(VI_ASRL_END_TERMCHAR),
      m_endOut(VI_ASRL_END_NONE)
{
}

bool SerialTransport::configure(const os::SerialSettings &settings)
{
    if (!m_port.configure(settings))
        return false;
    m_settings = settings;
    return true;
}

ViStatus SerialTransport::ended(os::IoResult result, const os::WaitLimit &limit)
{
    if (result == os::IoResult::Closed)
        m_port.close();
    return transferStatus(result, limit);
}

std::byte SerialTransport::topBit() const
{
    return static_cast<std::byte>(1u << (m_settings.dataBits - 1));
}

bool SerialTransport::endsAt(std::byte byte, const TransferMode &mode) const
{
    if (mode.suppressEnd)
        return false;
    if (m_endIn == VI_ASRL_END_TERMCHAR)
        return byte == static_cast<std::byte>(mode.termChar);
    return m_endIn == VI_ASRL_END_LAST_BIT && (byte & topBit()) != std::byte{0};
}

ViStatus SerialTransport::fill(const os::WaitLimit &limit)
{
    const os::Transfer got = m_port.receive(m_input.room(), limit);
    if (got.result != os::IoResult::Done)
        return ended(got.result, limit);
    m_input.received(got.count);
    if (const auto errors = m_port.errors())
        m_overrun = m_overrun || errors->overrun != m_errors.overrun;
    return VI_SUCCESS;
}

/// The error of the byte that was read last, from what the driver has counted since. Where it has counted both kinds, the other
/// one is that of a byte which is still to come.
ViStatus SerialTransport::takeError()
{
    m_input.errorTold();
    const os::SerialErrors now = m_port.errors().value_or(m_errors);
    if (now.parity != m_errors.parity) {
        m_errors.parity = now.parity;
        return VI_ERROR_ASRL_PARITY;
    }
    const bool framing = now.framing != m_errors.framing;
    m_errors.framing = now.framing;
    return framing || m_settings.parity == os::SerialParity::None ? VI_ERROR_ASRL_FRAMING : VI_ERROR_ASRL_PARITY;
}

ViStatus SerialTransport::read(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                               std::size_t &count)
{
    for (bool first = true;; first = false) {
        const auto available = m_input.data().first(std::min(m_input.data().size(), buffer.size() - count));
        const auto last = std::find_if(available.begin(), available.end(), [&](std::byte byte) {
            return endsAt(byte, mode) || (mode.termCharEnabled && byte == static_cast<std::byte>(mode.termChar));
        });
        const bool found = last != available.end();
        const std::size_t taken = static_cast<std::size_t>(last - available.begin()) + (found ? 1 : 0);
        std::copy_n(available.begin(), taken, buffer.begin() + static_cast<std::ptrdiff_t>(count));
        const std::byte lastByte = found ? *last : std::byte{0};
        count += taken;
        m_input.consume(taken);
        if (taken > 0 && m_input.atError())
            return takeError();
        if (found)
            return endsAt(lastByte, mode) ? VI_SUCCESS : VI_SUCCESS_TERM_CHAR;
        if (count == buffer.size())
            return VI_SUCCESS_MAX_CNT;
        if (m_overrun) {
            m_overrun = false;
            m_errors.overrun = m_port.errors().value_or(m_errors).overrun;
            return VI_ERROR_ASRL_OVERRUN;
        }
        const ViStatus status = !first && limit.deadline.expired() ? VI_ERROR_TMO : fill(limit);
        if (status < VI_SUCCESS) {
            m_answerMayBeLate = true;
            return status;
        }
    }
}

void SerialTransport::dropInput()
{
    m_port.discardInput();
    m_input.clear();
    m_answerMayBeLate = false;
    m_overrun = false;
    m_errors = m_port.errors().value_or(m_errors);
}

/// Sends @p data with the top bit of each byte clear, and set in the very last one where that is wanted.
ViStatus SerialTransport::sendMarked(std::span<const std::byte> data, bool markLast, const os::WaitLimit &limit,
                                     std::size_t &count)
{
    std::array<std::byte, 4096> piece;
    while (count < data.size()) {
        const std::size_t size = std::min(piece.size(), data.size() - count);
        std::transform(data.begin() + static_cast<std::ptrdiff_t>(count),
                       data.begin() + static_cast<std::ptrdiff_t>(count + size), piece.begin(),
                       [this](std::byte byte) { return byte & ~topBit(); });
        if (markLast && count + size == data.size())
            piece[size - 1] |= topBit();
        const os::Transfer sent = m_port.send(std::span(piece).first(size), limit);
        count += sent.count;
        if (sent.result != os::IoResult::Done)
            return ended(sent.result, limit);
    }
    return VI_SUCCESS;
}

ViStatus SerialTransport::write(std::span<const std::byte> data, const TransferMode &mode, const os::WaitLimit &limit,
                                std::size_t &count)
{
    if (!m_port.isOpen())
        return VI_ERROR_CONN_LOST;
    if (m_answerMayBeLate)
        dropInput();
    const ViStatus status = send(data, mode, limit, count);
    m_messageStopped = status < VI_SUCCESS;
    return status;
}

ViStatus SerialTransport::send(std::span<const std::byte> data, const TransferMode &mode, const os::WaitLimit &limit,
                               std::size_t &count)
{
    if (m_endOut == VI_ASRL_END_LAST_BIT)
        return sendMarked(data, mode.sendEnd, limit, count);
    const os::Transfer sent = m_port.send(data, limit);
    count = sent.count;
    if (sent.result != os::IoResult::Done || !mode.sendEnd)
        return ended(sent.result, limit);
    if (m_endOut == VI_ASRL_END_TERMCHAR) {
        const std::array end = {static_cast<std::byte>(mode.termChar)};
        return ended(m_port.send(end, limit).result, limit);
    }
    if (m_endOut != VI_ASRL_END_BREAK)
        return VI_SUCCESS;
    const os::IoResult drained = m_port.drain(limit);
    if (drained != os::IoResult::Done)
        return ended(drained, limit);
    const std::optional<os::IoResult> broken = m_port.sendBreak(limit);
    return broken ? ended(*broken, limit) : VI_ERROR_INV_SETUP;
}

ViStatus SerialTransport::readStatusByte(const TransferMode &mode, const os::WaitLimit &limit, ViUInt16 &status)
{
    if (mode.protocol != VI_PROT_4882_STRS)
        return VI_ERROR_INV_SETUP;
    const ViStatus result = queryStatusByte(*this, limit, status);
    m_answerMayBeLate = m_answerMayBeLate || result == VI_ERROR_RAW_RD_PROT_VIOL;
    return result;
}

ViStatus SerialTransport::trigger(const TransferMode &mode, const os::WaitLimit &limit)
{
    return mode.protocol == VI_PROT_4882_STRS ? sendTrigger(*this, limit) : VI_ERROR_INV_SETUP;
}

ViStatus SerialTransport::clear(const os::WaitLimit &limit)
{
    if (!m_port.isOpen())
        return VI_ERROR_CONN_LOST;
    m_port.discardOutput();
    const std::optional<os::IoResult> broken = m_port.sendBreak(limit);
    dropInput();
    return broken ? ended(*broken, limit) : VI_SUCCESS; // a port without a break has been cleared on this side
}

ViStatus SerialTransport::applyAttribute(ViAttr attribute, ViUInt64 value, const os::WaitLimit &)
{
    if (!m_port.isOpen())
        return VI_ERROR_CONN_LOST;
    os::SerialSettings wanted = m_settings;
    switch (attribute) {
    case VI_ATTR_ASRL_BAUD:
        wanted.baud = static_cast<std::uint32_t>(value);
        break;
    case VI_ATTR_ASRL_DATA_BITS:
        wanted.dataBits = static_cast<std::uint8_t>(value);
        break;
    case VI_ATTR_ASRL_PARITY:
        wanted.parity = static_cast<os::SerialParity>(value);
        break;
    case VI_ATTR_ASRL_STOP_BITS:
        wanted.stop = stopBits(value);
        break;
    case VI_ATTR_ASRL_FLOW_CNTRL:
        wanted.xonXoff = (value & VI_ASRL_FLOW_XON_XOFF) != 0;
        wanted.rtsCts = (value & VI_ASRL_FLOW_RTS_CTS) != 0;
        break;
    case VI_ATTR_ASRL_XON_CHAR:
        wanted.xon = static_cast<std::uint8_t>(value);
        break;
    case VI_ATTR_ASRL_XOFF_CHAR:
        wanted.xoff = static_cast<std::uint8_t>(value);
        break;
    case VI_ATTR_ASRL_END_IN:
        m_endIn = static_cast<ViUInt16>(value);
        return VI_SUCCESS;
    case VI_ATTR_ASRL_END_OUT:
        m_endOut = static_cast<ViUInt16>(value);
        return VI_SUCCESS;
    case VI_ATTR_ASRL_REPLACE_CHAR:
        m_input.setReplacement(static_cast<std::uint8_t>(value));
        return VI_SUCCESS;
    case VI_ATTR_ASRL_DTR_STATE:
        return m_port.setLine(SerialLine::Dtr, value == VI_STATE_ASSERTED) ? VI_SUCCESS : VI_ERROR_NSUP_ATTR_STATE;
    case VI_ATTR_ASRL_RTS_STATE:
        if (m_settings.rtsCts) // the driver's
            return VI_SUCCESS;
        return m_port.setLine(SerialLine::Rts, value == VI_STATE_ASSERTED) ? VI_SUCCESS : VI_ERROR_NSUP_ATTR_STATE;
    default:
        return VI_SUCCESS;
    }
    return configure(wanted) ? VI_SUCCESS : VI_ERROR_NSUP_ATTR_STATE;
}

bool SerialTransport::isLive(ViAttr attribute) const
{
    switch (attribute) {
    case VI_ATTR_ASRL_AVAIL_NUM:
    case VI_ATTR_ASRL_CTS_STATE:
    case VI_ATTR_ASRL_DCD_STATE:
    case VI_ATTR_ASRL_DSR_STATE:
    case VI_ATTR_ASRL_DTR_STATE:
    case VI_ATTR_ASRL_RI_STATE:
    case VI_ATTR_ASRL_RTS_STATE:
        return true;
    default:
        return false;
    }
}

ViStatus SerialTransport::readAttribute(ViAttr attribute, const os::WaitLimit &, ViUInt64 &value)
{
    if (!m_port.isOpen())
        return VI_ERROR_CONN_LOST;
    switch (attribute) {
    case VI_ATTR_ASRL_AVAIL_NUM:
        value = m_input.data().size() + m_port.waiting();
        return VI_SUCCESS;
    case VI_ATTR_ASRL_CTS_STATE:
        value = stateOf(m_port.line(SerialLine::Cts));
        return VI_SUCCESS;
    case VI_ATTR_ASRL_DCD_STATE:
        value = stateOf(m_port.line(SerialLine::Dcd));
        return VI_SUCCESS;
    case VI_ATTR_ASRL_DSR_STATE:
        value = stateOf(m_port.line(SerialLine::Dsr));
        return VI_SUCCESS;
    case VI_ATTR_ASRL_RI_STATE:
        value = stateOf(m_port.line(SerialLine::Ri));
        return VI_SUCCESS;
    case VI_ATTR_ASRL_DTR_STATE:
        value = stateOf(m_port.line(SerialLine::Dtr));
        return VI_SUCCESS;
    case VI_ATTR_ASRL_RTS_STATE:
        value = stateOf(m_port.line(SerialLine::Rts));
        return VI_SUCCESS;
    default:
        return VI_ERROR_NSUP_ATTR;
    }
}

ViStatus SerialTransport::flushLine(ViUInt16 mask, const os::WaitLimit &limit)
{
    if (!m_port.isOpen())
        return VI_ERROR_CONN_LOST;
    if ((mask & (VI_ASRL_IN_BUF | VI_ASRL_IN_BUF_DISCARD)) != 0)
        dropInput();
    if ((mask & VI_ASRL_OUT_BUF_DISCARD) != 0)
        m_port.discardOutput();
    return (mask & VI_ASRL_OUT_BUF) != 0 ? ended(m_port.drain(limit), limit) : VI_SUCCESS;
}

void SerialTransport::close()
{
    m_port.close(m_messageStopped ? os::SerialPort::Unsent::Discarded : os::SerialPort::Unsent::Leaves);
}

void SerialTransport::abandon()
{
    m_port.abandon();
}

} // namespace kyvisa
