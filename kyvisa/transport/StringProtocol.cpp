#include "kyvisa/transport/StringProtocol.h"

#include "kyvisa/include/visa.h"
#include "kyvisa/transport/Transport.h"

#include <array>
#include <charconv>
#include <string_view>

namespace kyvisa
{
namespace
{

constexpr std::size_t LongestStatusAnswer = 64;

ViStatus sendText(Transport &transport, std::string_view text, const os::WaitLimit &limit)
{
    TransferMode asItIs;
    asItIs.sendEnd = false;
    std::size_t count = 0;
    return transport.write(std::as_bytes(std::span(text)), asItIs, limit, count);
}

} // namespace

ViStatus queryStatusByte(Transport &transport, const os::WaitLimit &limit, ViUInt16 &status)
{
    if (const ViStatus sent = sendText(transport, "*STB?\n", limit); sent < VI_SUCCESS)
        return sent;
    std::array<char, LongestStatusAnswer> answer{};
    TransferMode line;
    line.termCharEnabled = true;
    line.suppressEnd = true;
    std::size_t count = 0;
    const ViStatus got = transport.read(std::as_writable_bytes(std::span(answer)), line, limit, count);
    if (got < VI_SUCCESS)
        return got;
    if (got != VI_SUCCESS_TERM_CHAR)
        return VI_ERROR_RAW_RD_PROT_VIOL;
    const char *first = answer.data(); // a line that ends by its '\n': neither loop nor comparison leaves it
    while (*first == ' ' || *first == '+')
        ++first;
    unsigned value = 0;
    const auto [end, error] = std::from_chars(first, answer.data() + count, value);
    if (error != std::errc() || value > 0xFF || (*end != '\n' && *end != '\r'))
        return VI_ERROR_RAW_RD_PROT_VIOL;
    status = static_cast<ViUInt16>(value);
    return VI_SUCCESS;
}

ViStatus sendTrigger(Transport &transport, const os::WaitLimit &limit)
{
    return sendText(transport, "*TRG\n", limit);
}

} // namespace kyvisa
