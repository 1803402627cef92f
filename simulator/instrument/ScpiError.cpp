#include "simulator/instrument/ScpiError.h"

#include "simulator/instrument/StatusBits.h"

#include <algorithm>
#include <array>

namespace simulator
{
namespace
{

struct Row {
    int number;
    std::string_view text;
};

constexpr std::array Texts{
    Row{0, "No error"},
    Row{-100, "Command error"},
    Row{-101, "Invalid character"},
    Row{-102, "Syntax error"},
    Row{-103, "Invalid separator"},
    Row{-104, "Data type error"},
    Row{-105, "GET not allowed"},
    Row{-108, "Parameter not allowed"},
    Row{-109, "Missing parameter"},
    Row{-112, "Program mnemonic too long"},
    Row{-113, "Undefined header"},
    Row{-114, "Header suffix out of range"},
    Row{-120, "Numeric data error"},
    Row{-121, "Invalid character in number"},
    Row{-123, "Exponent too large"},
    Row{-124, "Too many digits"},
    Row{-128, "Numeric data not allowed"},
    Row{-131, "Invalid suffix"},
    Row{-138, "Suffix not allowed"},
    Row{-141, "Invalid character data"},
    Row{-148, "Character data not allowed"},
    Row{-151, "Invalid string data"},
    Row{-158, "String data not allowed"},
    Row{-161, "Invalid block data"},
    Row{-168, "Block data not allowed"},
    Row{-171, "Invalid expression"},
    Row{-178, "Expression data not allowed"},
    Row{-200, "Execution error"},
    Row{-211, "Trigger ignored"},
    Row{-213, "Init ignored"},
    Row{-214, "Trigger deadlock"},
    Row{-221, "Settings conflict"},
    Row{-222, "Data out of range"},
    Row{-223, "Too much data"},
    Row{-224, "Illegal parameter value"},
    Row{-230, "Data corrupt or stale"},
    Row{-240, "Hardware error"},
    Row{-250, "Mass storage error"},
    Row{-252, "Missing media"},
    Row{-253, "Corrupt media"},
    Row{-254, "Media full"},
    Row{-255, "Directory full"},
    Row{-256, "File name not found"},
    Row{-257, "File name error"},
    Row{-258, "Media protected"},
    Row{-300, "Device-specific error"},
    Row{-310, "System error"},
    Row{-321, "Out of memory"},
    Row{-330, "Self-test failed"},
    Row{-350, "Queue overflow"},
    Row{-360, "Communication error"},
    Row{-361, "Parity error in program message"},
    Row{-362, "Framing error in program message"},
    Row{-363, "Input buffer overrun"},
    Row{-365, "Time out error"},
    Row{-400, "Query error"},
    Row{-410, "Query INTERRUPTED"},
    Row{-420, "Query UNTERMINATED"},
    Row{-430, "Query DEADLOCKED"},
    Row{-440, "Query UNTERMINATED after indefinite response"},
};

} // namespace

std::string_view errorText(int number)
{
    const auto find = [](int wanted) {
        return std::find_if(Texts.begin(), Texts.end(), [=](const Row &row) { return row.number == wanted; });
    };
    if (const auto row = find(number); row != Texts.end())
        return row->text;
    const auto row = find(number / 100 * 100);
    return row != Texts.end() && row->number != 0 ? row->text : "Device-specific error";
}

std::uint8_t eventOfError(int number)
{
    switch (number / 100) {
    case -1:
        return EsrCommandError;
    case -2:
        return EsrExecutionError;
    case -4:
        return EsrQueryError;
    case -5:
        return EsrPowerOn;
    case -6:
        return EsrUserRequest;
    case -7:
        return EsrRequestControl;
    case -8:
        return EsrOperationComplete;
    default:
        return number == 0 ? 0 : EsrDeviceError;
    }
}

} // namespace simulator
