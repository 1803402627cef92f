#pragma once

#include "kyvisa/os/StreamSocket.h"
#include "kyvisa/transport/ReceiveBuffer.h"
#include "kyvisa/transport/Transport.h"

namespace kyvisa
{

/**
 * A raw TCP connection. There is no END: a read ends by the termination character or by its count.
 *
 * Nothing tells an answer that comes too late from the answer to the next question. So once a read has timed out, whatever
 * has arrived by the next write or clear is dropped before that goes out.
 */
class SocketTransport : public Transport
{
public:
    explicit SocketTransport(os::StreamSocket socket);

    ViStatus read(std::span<std::byte> buffer, const TransferMode &mode, const os::WaitLimit &limit,
                  std::size_t &count) override;
    ViStatus write(std::span<const std::byte> data, const TransferMode &mode, const os::WaitLimit &limit,
                   std::size_t &count) override;
    ViStatus readStatusByte(const TransferMode &mode, const os::WaitLimit &limit, ViUInt16 &status) override;
    ViStatus trigger(const TransferMode &mode, const os::WaitLimit &limit) override;
    ViStatus clear(const os::WaitLimit &limit) override;
    ViStatus applyAttribute(ViAttr attribute, ViUInt64 value, const os::WaitLimit &limit) override;
    ViStatus flushLine(ViUInt16 mask, const os::WaitLimit &limit) override;
    ViStatus resizeLine(ViUInt16 mask, std::size_t size) override;
    void close() override;
    void abandon() override;

private:
    ViStatus ended(os::IoResult result, const os::WaitLimit &limit);
    bool dropInput(const os::WaitLimit &limit);

    os::StreamSocket m_socket;
    ReceiveBuffer m_input;
    bool m_answerMayBeLate = false;
};

} // namespace kyvisa
