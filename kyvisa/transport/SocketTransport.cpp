#include "kyvisa/transport/SocketTransport.h"

#include "kyvisa/include/visa.h"
#include "kyvisa/transport/IoStatus.h"
#include "kyvisa/transport/StringProtocol.h"

#include <algorithm>
#include <array>
#include <cstring>

namespace kyvisa
{
namespace
{

constexpr std::size_t InputCapacity = 64 * 1024;

} // namespace

SocketTransport::SocketTransport(os::StreamSocket socket) : m_socket(std::move(socket)), m_input(InputCapacity) {}

ViStatus SocketTransport::ended(os::IoResult result, const os::WaitLimit &limit)
{
    if (result == os::IoResult::Closed)
        m_socket.close();
    return transferStatus(result, limit);
}

ViStatus SocketTransport::read(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                               std::size_t &count)
{
    for (bool first = true;; first = false) {
        auto wanted = std::min(buffer.size() - count, m_input.data().size());
        bool terminated = false;
        if (mode.termCharEnabled && wanted > 0) {
            const void *found = std::memchr(m_input.data().data(), mode.termChar, wanted);
            if (found) {
                terminated = true;
                wanted = static_cast<std::size_t>(static_cast<const std::byte *>(found) - m_input.data().data()) + 1;
            }
        }
        count += m_input.take(buffer.subspan(count, wanted));
        if (terminated)
            return VI_SUCCESS_TERM_CHAR;
        if (count == buffer.size())
            return VI_SUCCESS_MAX_CNT;

        os::Transfer got;
        if (!first && limit.deadline.expired()) {
            got.result = os::IoResult::TimedOut;
        } else if (!mode.termCharEnabled && buffer.size() - count >= InputCapacity) {
            const auto rest = buffer.subspan(count);
            got = m_socket.receive(rest, limit);
            count += got.count;
        } else {
            got = m_input.fill(m_socket, limit);
        }
        if (got.result != os::IoResult::Done) {
            m_answerMayBeLate = true;
            return ended(got.result, limit);
        }
    }
}

bool SocketTransport::dropInput(const os::WaitLimit &limit)
{
    m_answerMayBeLate = false;
    // A peer that never stops sending must not hold the call: deadline and wake-up end this too.
    do {
        m_input.clear();
        const os::Transfer got = m_input.fillNow(m_socket);
        if (got.result != os::IoResult::Done) {
            m_socket.close();
            return false;
        }
    } while (!m_input.empty() && !limit.deadline.expired() && !limit.wakeup.raised());
    m_input.clear();
    return true;
}

ViStatus SocketTransport::write(std::span<const std::byte> data, const TransferMode &, const os::WaitLimit &limit,
                                std::size_t &count)
{
    if (m_answerMayBeLate && !dropInput(limit))
        return VI_ERROR_CONN_LOST;
    std::array pieces = {iovec{const_cast<std::byte *>(data.data()), data.size()}};
    const os::Transfer sent = m_socket.send(pieces, limit);
    count = sent.count;
    return ended(sent.result, limit);
}

ViStatus SocketTransport::readStatusByte(const TransferMode &mode, const os::WaitLimit &limit, ViUInt16 &status)
{
    if (mode.protocol != VI_PROT_4882_STRS)
        return VI_ERROR_INV_SETUP;
    const ViStatus result = queryStatusByte(*this, limit, status);
    m_answerMayBeLate = m_answerMayBeLate || result == VI_ERROR_RAW_RD_PROT_VIOL; // the rest is nobody's answer
    return result;
}

ViStatus SocketTransport::trigger(const TransferMode &mode, const os::WaitLimit &limit)
{
    return mode.protocol == VI_PROT_4882_STRS ? sendTrigger(*this, limit) : VI_ERROR_INV_SETUP;
}

ViStatus SocketTransport::flushLine(ViUInt16 mask, const os::WaitLimit &limit)
{
    if ((mask & (VI_IO_IN_BUF | VI_IO_IN_BUF_DISCARD)) == 0)
        return VI_SUCCESS; // what was sent is the system's
    return dropInput(limit) ? VI_SUCCESS : VI_ERROR_CONN_LOST;
}

ViStatus SocketTransport::resizeLine(ViUInt16 mask, std::size_t size)
{
    return resizeBuffersOf(m_socket, mask, size);
}

ViStatus SocketTransport::clear(const os::WaitLimit &limit)
{
    return dropInput(limit) ? VI_SUCCESS : VI_ERROR_CONN_LOST;
}

ViStatus SocketTransport::applyAttribute(ViAttr attribute, ViUInt64 value, const os::WaitLimit &)
{
    const bool on = value != 0;
    const bool applied = attribute == VI_ATTR_TCPIP_NODELAY ? m_socket.setNoDelay(on) : m_socket.setKeepAlive(on);
    return applied ? VI_SUCCESS : VI_ERROR_NSUP_ATTR_STATE;
}

void SocketTransport::close()
{
    m_socket.close();
}

void SocketTransport::abandon()
{
    m_socket.close();
}

} // namespace kyvisa
