#include "kyvisa/core/FormattedIo.h"

#include "kyvisa/core/InstrumentSession.h"
#include "kyvisa/include/visa.h"

namespace kyvisa
{
namespace
{

constexpr std::size_t LargestBuffer = std::size_t{64} << 20;
constexpr ViUInt16 FormattedMask = VI_READ_BUF | VI_WRITE_BUF | VI_READ_BUF_DISCARD | VI_WRITE_BUF_DISCARD;
constexpr ViUInt16 SystemMask = VI_IO_IN_BUF | VI_IO_OUT_BUF | VI_IO_IN_BUF_DISCARD | VI_IO_OUT_BUF_DISCARD;

/// The session's transfers, all under the deadline of the operation that uses them.
class SessionChannel : public format::MessageChannel
{
public:
    SessionChannel(InstrumentSession &session, os::Deadline deadline) : m_session(session), m_deadline(deadline) {}

    ViStatus write(std::span<const std::byte> data, bool end) override
    {
        std::size_t count = 0;
        return m_session.write(data, count, m_deadline, end);
    }

    ViStatus read(std::span<std::byte> data, std::size_t &count) override
    {
        return m_session.read(data, count, m_deadline);
    }

    bool readsEnd() const override
    {
        const AttributeStore &attributes = m_session.attributes();
        if (attributes.number(VI_ATTR_TERMCHAR_EN) != 0)
            return true;
        switch (attributes.kind()) {
        case kind::Socket:
            return false;
        case kind::Serial:
            return attributes.number(VI_ATTR_ASRL_END_IN) != VI_ASRL_END_NONE;
        default:
            return attributes.number(VI_ATTR_SUPPRESS_END_EN) == 0;
        }
    }

private:
    InstrumentSession &m_session;
    const os::Deadline m_deadline;
};

} // namespace

/// Runs @p work when locks allow it and the turn has come. The buffers are only ever used inside.
template <typename Work>
ViStatus FormattedIo::inTurn(const Work &work)
{
    const os::Deadline deadline = m_session.operationDeadline();
    if (const ViStatus status = m_session.mayTransfer(); status != VI_SUCCESS)
        return status;
    switch (m_turn.enter(deadline)) {
    case IoGate::Entered::TimedOut:
        return VI_ERROR_TMO;
    case IoGate::Entered::Closed:
    case IoGate::Entered::Cancelled:
        return VI_ERROR_INV_OBJECT;
    case IoGate::Entered::Yes:
        break;
    }
    const GateTurn turn(m_turn);
    if (m_forget.exchange(false)) {
        m_buffers.output.discard();
        m_buffers.input.discard();
    }
    SessionChannel channel(m_session, deadline);
    return work(channel);
}

bool FormattedIo::flushesOnAccess(ViAttr mode) const
{
    return m_session.attributes().number(mode) == VI_FLUSH_ON_ACCESS;
}

ViStatus FormattedIo::print(const char *text, format::Arguments &arguments)
{
    format::Directives directives;
    if (const ViStatus status = format::parseOutputFormat(text, directives); status < VI_SUCCESS)
        return status;
    return inTurn([&](format::MessageChannel &channel) {
        return m_buffers.print(directives, arguments, flushesOnAccess(VI_ATTR_WR_BUF_OPER_MODE), channel);
    });
}

ViStatus FormattedIo::scan(const char *text, format::Arguments &arguments)
{
    format::Directives directives;
    if (const ViStatus status = format::parseInputFormat(text, directives); status < VI_SUCCESS)
        return status;
    return inTurn([&](format::MessageChannel &channel) {
        return m_buffers.scan(directives, arguments, flushesOnAccess(VI_ATTR_RD_BUF_OPER_MODE), channel);
    });
}

ViStatus FormattedIo::query(const char *output, const char *input, format::Arguments &arguments)
{
    format::Directives printed;
    format::Directives scanned;
    if (const ViStatus status = format::parseOutputFormat(output, printed); status < VI_SUCCESS)
        return status;
    if (const ViStatus status = format::parseInputFormat(input, scanned); status < VI_SUCCESS)
        return status;
    return inTurn([&](format::MessageChannel &channel) {
        m_buffers.input.discard();
        const ViStatus sent = m_buffers.print(printed, arguments, true, channel);
        if (sent < VI_SUCCESS)
            return sent;
        return m_buffers.scan(scanned, arguments, flushesOnAccess(VI_ATTR_RD_BUF_OPER_MODE), channel);
    });
}

ViStatus FormattedIo::write(std::span<const std::byte> data, std::size_t &count)
{
    count = 0;
    return inTurn([&](format::MessageChannel &channel) {
        const ViStatus status = m_buffers.output.append(data, channel);
        count = status < VI_SUCCESS ? 0 : data.size();
        return status;
    });
}

ViStatus FormattedIo::read(std::span<std::byte> data, std::size_t &count)
{
    count = 0;
    if (data.empty())
        return VI_SUCCESS_MAX_CNT;
    return inTurn([&](format::MessageChannel &channel) { return m_buffers.read(data, count, channel); });
}

ViStatus FormattedIo::setBuffer(ViUInt16 mask, ViUInt32 size)
{
    constexpr ViUInt16 Known = VI_READ_BUF | VI_WRITE_BUF | VI_IO_IN_BUF | VI_IO_OUT_BUF;
    if (mask == 0 || (mask & ~Known) != 0)
        return VI_ERROR_INV_MASK;
    if (size == 0 || size > LargestBuffer)
        return VI_WARN_NSUP_BUF;
    return inTurn([&](format::MessageChannel &channel) -> ViStatus {
        if ((mask & VI_READ_BUF) != 0) {
            m_buffers.input.resize(size);
            m_session.setBufferSize(VI_ATTR_RD_BUF_SIZE, size);
        }
        ViStatus status = VI_SUCCESS;
        if ((mask & VI_WRITE_BUF) != 0) {
            m_session.setBufferSize(VI_ATTR_WR_BUF_SIZE, size);
            status = m_buffers.output.resize(size, channel);
        }
        if (status >= VI_SUCCESS && (mask & SystemMask) != 0)
            status = m_session.resizeLine(mask & SystemMask, size);
        return status;
    });
}

ViStatus FormattedIo::flush(ViUInt16 mask)
{
    const auto contradictory = [&](ViUInt16 one, ViUInt16 other) { return (mask & one) != 0 && (mask & other) != 0; };
    if (mask == 0 || (mask & ~(FormattedMask | SystemMask)) != 0 || contradictory(VI_READ_BUF, VI_READ_BUF_DISCARD) ||
        contradictory(VI_WRITE_BUF, VI_WRITE_BUF_DISCARD) || contradictory(VI_IO_IN_BUF, VI_IO_IN_BUF_DISCARD) ||
        contradictory(VI_IO_OUT_BUF, VI_IO_OUT_BUF_DISCARD))
        return VI_ERROR_INV_MASK;
    return inTurn([&](format::MessageChannel &channel) -> ViStatus {
        if ((mask & VI_WRITE_BUF_DISCARD) != 0)
            m_buffers.output.discard();
        if ((mask & VI_READ_BUF_DISCARD) != 0)
            m_buffers.input.discard();
        ViStatus status = VI_SUCCESS;
        if ((mask & VI_WRITE_BUF) != 0)
            status = m_buffers.output.flush(channel);
        if (status >= VI_SUCCESS && (mask & VI_READ_BUF) != 0)
            status = m_buffers.input.flush(channel);
        if (status >= VI_SUCCESS && (mask & SystemMask) != 0)
            status = m_session.flushLine(mask & SystemMask);
        return status;
    });
}

} // namespace kyvisa
