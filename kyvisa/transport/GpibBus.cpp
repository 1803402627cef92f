#include "kyvisa/transport/GpibBus.h"

#include "kyvisa/include/visa.h"
#include "kyvisa/transport/Vxi11Core.h"

#include <algorithm>

namespace kyvisa
{

using namespace wire::vxi11;

namespace
{

constexpr bool NetworkOrder = true;

template <typename Number>
std::vector<std::byte> bytesOf(Number number)
{
    std::vector<std::byte> bytes;
    appendNumber(bytes, number, NetworkOrder);
    return bytes;
}

} // namespace

ViStatus GpibBus::perform(Command command, std::size_t elementSize, std::span<const std::byte> data,
                          const os::WaitLimit &limit, std::vector<std::byte> &answer)
{
    if (!m_core.isOpen())
        return VI_ERROR_CONN_LOST;
    DocmdCall call;
    call.link = m_link;
    call.ioTimeout = Vxi11Core::deviceTime(limit);
    call.command = static_cast<std::uint32_t>(command);
    call.networkOrder = NetworkOrder;
    call.dataSize = static_cast<std::int32_t>(elementSize);
    call.data = data;
    return m_core.command(call, limit, answer);
}

ViStatus GpibBus::ask(BusQuestion question, const os::WaitLimit &limit, std::uint16_t &answer)
{
    std::vector<std::byte> bytes;
    const auto number = static_cast<std::uint16_t>(question);
    const ViStatus status = perform(Command::BusStatus, sizeof number, bytesOf(number), limit, bytes);
    if (status < VI_SUCCESS)
        return status;
    if (bytes.size() != sizeof answer)
        return VI_ERROR_IO;
    answer = static_cast<std::uint16_t>(std::to_integer<unsigned>(bytes[0]) << 8 | std::to_integer<unsigned>(bytes[1]));
    return VI_SUCCESS;
}

ViStatus GpibBus::order(Command command, std::size_t elementSize, std::span<const std::byte> data,
                        const os::WaitLimit &limit)
{
    std::vector<std::byte> answer;
    const ViStatus status = perform(command, elementSize, data, limit, answer);
    if (status != VI_ERROR_IO)
        return status;
    const bool ofTheSystem = command == Command::RenControl || command == Command::IfcControl;
    std::uint16_t has = 1;
    const ViStatus told =
        ask(ofTheSystem ? BusQuestion::SystemController : BusQuestion::ControllerInCharge, limit, has);
    if (told < VI_SUCCESS || has != 0)
        return status;
    return ofTheSystem ? VI_ERROR_NSYS_CNTLR : VI_ERROR_NCIC;
}

ViStatus GpibBus::sendCommands(std::span<const std::byte> commands, const os::WaitLimit &limit, std::size_t &count)
{
    count = 0;
    while (count < commands.size()) {
        const auto piece = commands.subspan(count, std::min(MaxBusCommands, commands.size() - count));
        if (const ViStatus status = order(Command::SendCommand, 1, piece, limit); status < VI_SUCCESS)
            return status;
        count += piece.size();
        if (count < commands.size() && limit.deadline.expired())
            return VI_ERROR_TMO;
    }
    return VI_SUCCESS;
}

ViStatus GpibBus::setAttention(bool on, const os::WaitLimit &limit)
{
    return order(Command::AtnControl, 2, bytesOf(std::uint16_t{on}), limit);
}

ViStatus GpibBus::setRemoteEnable(bool on, const os::WaitLimit &limit)
{
    return order(Command::RenControl, 2, bytesOf(std::uint16_t{on}), limit);
}

ViStatus GpibBus::passControl(std::uint32_t address, const os::WaitLimit &limit)
{
    return order(Command::PassControl, 4, bytesOf(address), limit);
}

ViStatus GpibBus::setAddress(std::uint32_t address, const os::WaitLimit &limit)
{
    return order(Command::BusAddress, 4, bytesOf(address), limit);
}

ViStatus GpibBus::clearInterface(const os::WaitLimit &limit)
{
    return order(Command::IfcControl, 0, {}, limit);
}

} // namespace kyvisa
