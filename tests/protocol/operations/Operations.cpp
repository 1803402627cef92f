#include "Operations.h"

#include "kyvisa/core/StatusTable.h"

#include <array>
#include <cstdarg>
#include <cstring>
#include <fstream>

namespace operations
{
namespace
{

// Buffers of asynchronous transfers outlive the call.
std::array<ViByte, 1024> buffer;
ViUInt32 count = 0;
ViJobId job = 0;
std::array<ViChar, 1024> text;

void nothing(const Subject &) {}

void write(const Subject &on, const char *message)
{
    viWrite(on.handle, reinterpret_cast<ViConstBuf>(message), static_cast<ViUInt32>(std::strlen(message)), &count);
}

/// The interface talks to the instrument at address 5, or the other way round (IEEE 488.1: UNL, talker, listener).
void address(const Subject &on, bool instrumentTalks)
{
    ViUInt16 own = 0;
    viGetAttribute(on.handle, VI_ATTR_GPIB_PRIMARY_ADDR, &own);
    const int talker = instrumentTalks ? 5 : own;
    const int listener = instrumentTalks ? own : 5;
    const std::array<ViByte, 3> commands = {0x3F, static_cast<ViByte>(0x40 + talker),
                                            static_cast<ViByte>(0x20 + listener)};
    viGpibCommand(on.handle, commands.data(), 3, nullptr);
}

void addressListener(const Subject &on)
{
    if (on.isInterface)
        address(on, false);
}

void ask(const Subject &on)
{
    addressListener(on);
    write(on, "*OPC?\n");
    if (on.isInterface)
        address(on, true);
}

void lockIt(const Subject &on)
{
    viLock(on.handle, VI_EXCLUSIVE_LOCK, 10000, nullptr, nullptr);
}

void saveFile(const Subject &on)
{
    std::ofstream(on.file) << "*CLS\n";
    addressListener(on);
}

ViStatus handler(ViSession, ViEventType, ViEvent, ViAddr)
{
    return VI_SUCCESS;
}

void install(const Subject &on)
{
    viInstallHandler(on.handle, VI_EVENT_IO_COMPLETION, handler, nullptr);
}

void enable(const Subject &on)
{
    viEnableEvent(on.handle, VI_EVENT_IO_COMPLETION, VI_QUEUE, VI_NULL);
}

void transferAndNotify(const Subject &on)
{
    addressListener(on);
    enable(on);
    viWriteAsync(on.handle, reinterpret_cast<ViConstBuf>("*CLS\n"), 5, &job);
}

ViStatus vprintf(const Subject &on, const char *format, ...)
{
    va_list list;
    va_start(list, format);
    const ViStatus status = viVPrintf(on.handle, format, list);
    va_end(list);
    return status;
}

ViStatus vsprintf(const Subject &on, const char *format, ...)
{
    va_list list;
    va_start(list, format);
    const ViStatus status = viVSPrintf(on.handle, buffer.data(), format, list);
    va_end(list);
    return status;
}

ViStatus vscanf(const Subject &on, const char *format, ...)
{
    va_list list;
    va_start(list, format);
    const ViStatus status = viVScanf(on.handle, format, list);
    va_end(list);
    return status;
}

ViStatus vsscanf(const Subject &on, const char *from, const char *format, ...)
{
    va_list list;
    va_start(list, format);
    const ViStatus status = viVSScanf(on.handle, reinterpret_cast<ViConstBuf>(from), format, list);
    va_end(list);
    return status;
}

ViStatus vqueryf(const Subject &on, const char *format, const char *inputFormat, ...)
{
    va_list list;
    va_start(list, inputFormat);
    const ViStatus status = viVQueryf(on.handle, format, inputFormat, list);
    va_end(list);
    return status;
}

/// viPeek and viPoke.
template <typename Call>
auto silent(const Call &call)
{
    return [call](const Subject &on) {
        call(on);
        return VI_SUCCESS;
    };
}

using S = const Subject &;

ViUInt8 value8;
ViUInt16 value16;
ViUInt32 value32;
ViUInt64 value64;
ViBusAddress offset;
ViBusAddress64 offset64;
ViAddr window;
ViInt16 failure;
std::array<ViInt16, 1> lines;
std::array<ViUInt8, 8> block8;
std::array<ViUInt16, 8> block16;
std::array<ViUInt32, 8> block32;
std::array<ViUInt64, 8> block64;

// clang-format off
const std::vector<Operation> table = {
    {"viAssertIntrSignal", nothing, [](S on) { return viAssertIntrSignal(on.handle, VI_ASSERT_USE_ASSIGNED, 0); }},
    {"viAssertTrigger", addressListener, [](S on) { return viAssertTrigger(on.handle, VI_TRIG_PROT_DEFAULT); }},
    {"viAssertUtilSignal", nothing, [](S on) { return viAssertUtilSignal(on.handle, VI_UTIL_ASSERT_SYSRESET); }},
    {"viBufRead", ask, [](S on) { return viBufRead(on.handle, buffer.data(), 100, &count); }},
    {"viBufWrite", addressListener, [](S on) { return viBufWrite(on.handle, reinterpret_cast<ViConstBuf>("*CLS\n"), 5, &count); }},
    {"viClear", nothing, [](S on) { return viClear(on.handle); }},
    {"viClose", nothing, [](S on) { return viClose(on.handle); }},
    {"viDisableEvent", enable, [](S on) { return viDisableEvent(on.handle, VI_EVENT_IO_COMPLETION, VI_QUEUE); }},
    {"viDiscardEvents", nothing, [](S on) { return viDiscardEvents(on.handle, VI_EVENT_IO_COMPLETION, VI_QUEUE); }},
    {"viEnableEvent", nothing, [](S on) { return viEnableEvent(on.handle, VI_EVENT_IO_COMPLETION, VI_QUEUE, VI_NULL); }},
    {"viFindNext", nothing, [](S on) { return viFindNext(on.handle, text.data()); }},
    {"viFindRsrc", nothing, [](S on) { return viFindRsrc(on.handle, "GPIB?*", nullptr, &count, text.data()); }},
    {"viFlush", nothing, [](S on) { return viFlush(on.handle, VI_WRITE_BUF); }},
    {"viGetAttribute", nothing, [](S on) { return viGetAttribute(on.handle, VI_ATTR_RSRC_MANF_NAME, text.data()); }},
    {"viGetDefaultRM", nothing, [](S) { ViSession rm; const ViStatus status = viGetDefaultRM(&rm); viClose(rm); return status; }},
    {"viGpibCommand", nothing, [](S on) { return viGpibCommand(on.handle, reinterpret_cast<ViConstBuf>("?_"), 2, &count); }},
    {"viGpibControlATN", nothing, [](S on) { return viGpibControlATN(on.handle, VI_GPIB_ATN_DEASSERT); }},
    {"viGpibControlREN", nothing, [](S on) { return viGpibControlREN(on.handle, on.isInterface ? VI_GPIB_REN_ASSERT : VI_GPIB_REN_ASSERT_ADDRESS); }},
    {"viGpibPassControl", nothing, [](S on) { return viGpibPassControl(on.handle, 5, VI_NO_SEC_ADDR); }},
    {"viGpibSendIFC", nothing, [](S on) { return viGpibSendIFC(on.handle); }},
    {"viIn16", nothing, [](S on) { return viIn16(on.handle, VI_A16_SPACE, 0, &value16); }},
    {"viIn16Ex", nothing, [](S on) { return viIn16Ex(on.handle, VI_A16_SPACE, 0, &value16); }},
    {"viIn32", nothing, [](S on) { return viIn32(on.handle, VI_A16_SPACE, 0, &value32); }},
    {"viIn32Ex", nothing, [](S on) { return viIn32Ex(on.handle, VI_A16_SPACE, 0, &value32); }},
    {"viIn64", nothing, [](S on) { return viIn64(on.handle, VI_A16_SPACE, 0, &value64); }},
    {"viIn64Ex", nothing, [](S on) { return viIn64Ex(on.handle, VI_A16_SPACE, 0, &value64); }},
    {"viIn8", nothing, [](S on) { return viIn8(on.handle, VI_A16_SPACE, 0, &value8); }},
    {"viIn8Ex", nothing, [](S on) { return viIn8Ex(on.handle, VI_A16_SPACE, 0, &value8); }},
    {"viInstallHandler", nothing, [](S on) { return viInstallHandler(on.handle, VI_EVENT_IO_COMPLETION, handler, nullptr); }},
    {"viLock", nothing, [](S on) { return viLock(on.handle, VI_SHARED_LOCK, 10000, nullptr, text.data()); }},
    {"viMapAddress", nothing, [](S on) { return viMapAddress(on.handle, VI_A16_SPACE, 0, 8, VI_FALSE, nullptr, &window); }},
    {"viMapAddressEx", nothing, [](S on) { return viMapAddressEx(on.handle, VI_A16_SPACE, 0, 8, VI_FALSE, nullptr, &window); }},
    {"viMapTrigger", nothing, [](S on) { return viMapTrigger(on.handle, VI_TRIG_TTL0, VI_TRIG_TTL1, 0); }},
    {"viMemAlloc", nothing, [](S on) { return viMemAlloc(on.handle, 8, &offset); }},
    {"viMemAllocEx", nothing, [](S on) { return viMemAllocEx(on.handle, 8, &offset64); }},
    {"viMemFree", nothing, [](S on) { return viMemFree(on.handle, 0); }},
    {"viMemFreeEx", nothing, [](S on) { return viMemFreeEx(on.handle, 0); }},
    {"viMove", nothing, [](S on) { return viMove(on.handle, VI_A16_SPACE, 0, VI_WIDTH_8, VI_A16_SPACE, 8, VI_WIDTH_8, 8); }},
    {"viMoveAsync", nothing, [](S on) { return viMoveAsync(on.handle, VI_A16_SPACE, 0, VI_WIDTH_8, VI_A16_SPACE, 8, VI_WIDTH_8, 8, &job); }},
    {"viMoveAsyncEx", nothing, [](S on) { return viMoveAsyncEx(on.handle, VI_A16_SPACE, 0, VI_WIDTH_8, VI_A16_SPACE, 8, VI_WIDTH_8, 8, &job); }},
    {"viMoveEx", nothing, [](S on) { return viMoveEx(on.handle, VI_A16_SPACE, 0, VI_WIDTH_8, VI_A16_SPACE, 8, VI_WIDTH_8, 8); }},
    {"viMoveIn16", nothing, [](S on) { return viMoveIn16(on.handle, VI_A16_SPACE, 0, 8, block16.data()); }},
    {"viMoveIn16Ex", nothing, [](S on) { return viMoveIn16Ex(on.handle, VI_A16_SPACE, 0, 8, block16.data()); }},
    {"viMoveIn32", nothing, [](S on) { return viMoveIn32(on.handle, VI_A16_SPACE, 0, 8, block32.data()); }},
    {"viMoveIn32Ex", nothing, [](S on) { return viMoveIn32Ex(on.handle, VI_A16_SPACE, 0, 8, block32.data()); }},
    {"viMoveIn64", nothing, [](S on) { return viMoveIn64(on.handle, VI_A16_SPACE, 0, 8, block64.data()); }},
    {"viMoveIn64Ex", nothing, [](S on) { return viMoveIn64Ex(on.handle, VI_A16_SPACE, 0, 8, block64.data()); }},
    {"viMoveIn8", nothing, [](S on) { return viMoveIn8(on.handle, VI_A16_SPACE, 0, 8, block8.data()); }},
    {"viMoveIn8Ex", nothing, [](S on) { return viMoveIn8Ex(on.handle, VI_A16_SPACE, 0, 8, block8.data()); }},
    {"viMoveOut16", nothing, [](S on) { return viMoveOut16(on.handle, VI_A16_SPACE, 0, 8, block16.data()); }},
    {"viMoveOut16Ex", nothing, [](S on) { return viMoveOut16Ex(on.handle, VI_A16_SPACE, 0, 8, block16.data()); }},
    {"viMoveOut32", nothing, [](S on) { return viMoveOut32(on.handle, VI_A16_SPACE, 0, 8, block32.data()); }},
    {"viMoveOut32Ex", nothing, [](S on) { return viMoveOut32Ex(on.handle, VI_A16_SPACE, 0, 8, block32.data()); }},
    {"viMoveOut64", nothing, [](S on) { return viMoveOut64(on.handle, VI_A16_SPACE, 0, 8, block64.data()); }},
    {"viMoveOut64Ex", nothing, [](S on) { return viMoveOut64Ex(on.handle, VI_A16_SPACE, 0, 8, block64.data()); }},
    {"viMoveOut8", nothing, [](S on) { return viMoveOut8(on.handle, VI_A16_SPACE, 0, 8, block8.data()); }},
    {"viMoveOut8Ex", nothing, [](S on) { return viMoveOut8Ex(on.handle, VI_A16_SPACE, 0, 8, block8.data()); }},
    {"viOpen", nothing, [](S on) { ViSession vi; const ViStatus status = viOpen(on.handle, on.resource.c_str(), VI_NO_LOCK, 10000, &vi); if (status == VI_SUCCESS) viClose(vi); return status; }},
    {"viOpenDefaultRM", nothing, [](S) { ViSession rm; const ViStatus status = viOpenDefaultRM(&rm); viClose(rm); return status; }},
    {"viOut16", nothing, [](S on) { return viOut16(on.handle, VI_A16_SPACE, 0, 1); }},
    {"viOut16Ex", nothing, [](S on) { return viOut16Ex(on.handle, VI_A16_SPACE, 0, 1); }},
    {"viOut32", nothing, [](S on) { return viOut32(on.handle, VI_A16_SPACE, 0, 1); }},
    {"viOut32Ex", nothing, [](S on) { return viOut32Ex(on.handle, VI_A16_SPACE, 0, 1); }},
    {"viOut64", nothing, [](S on) { return viOut64(on.handle, VI_A16_SPACE, 0, 1); }},
    {"viOut64Ex", nothing, [](S on) { return viOut64Ex(on.handle, VI_A16_SPACE, 0, 1); }},
    {"viOut8", nothing, [](S on) { return viOut8(on.handle, VI_A16_SPACE, 0, 1); }},
    {"viOut8Ex", nothing, [](S on) { return viOut8Ex(on.handle, VI_A16_SPACE, 0, 1); }},
    {"viParseRsrc", nothing, [](S on) { return viParseRsrc(on.handle, on.resource.c_str(), &value16, &value16); }},
    {"viParseRsrcEx", nothing, [](S on) { return viParseRsrcEx(on.handle, on.resource.c_str(), &value16, &value16, text.data(), nullptr, nullptr); }},
    {"viPeek16", nothing, silent([](S on) { viPeek16(on.handle, nullptr, &value16); }), false},
    {"viPeek32", nothing, silent([](S on) { viPeek32(on.handle, nullptr, &value32); }), false},
    {"viPeek64", nothing, silent([](S on) { viPeek64(on.handle, nullptr, &value64); }), false},
    {"viPeek8", nothing, silent([](S on) { viPeek8(on.handle, nullptr, &value8); }), false},
    {"viPoke16", nothing, silent([](S on) { viPoke16(on.handle, nullptr, 1); }), false},
    {"viPoke32", nothing, silent([](S on) { viPoke32(on.handle, nullptr, 1); }), false},
    {"viPoke64", nothing, silent([](S on) { viPoke64(on.handle, nullptr, 1); }), false},
    {"viPoke8", nothing, silent([](S on) { viPoke8(on.handle, nullptr, 1); }), false},
    {"viPrintf", addressListener, [](S on) { return viPrintf(on.handle, "*ESE %d\n", 1); }},
    {"viPxiReserveTriggers", nothing, [](S on) { return viPxiReserveTriggers(on.handle, 1, lines.data(), lines.data(), &failure); }},
    {"viQueryf", ask, [](S on) { return viQueryf(on.handle, on.isInterface ? "" : "*ESE?\n", "%d", &value32); }},
    {"viRead", ask, [](S on) { return viRead(on.handle, buffer.data(), 100, &count); }},
    {"viReadAsync", ask, [](S on) { return viReadAsync(on.handle, buffer.data(), 100, &job); }},
    {"viReadSTB", nothing, [](S on) { return viReadSTB(on.handle, &value16); }},
    {"viReadToFile", ask, [](S on) { return viReadToFile(on.handle, on.file.c_str(), 100, &count); }},
    {"viSPrintf", nothing, [](S on) { return viSPrintf(on.handle, buffer.data(), "%d", 1); }},
    {"viSScanf", nothing, [](S on) { return viSScanf(on.handle, reinterpret_cast<ViConstBuf>("1"), "%d", &value32); }},
    {"viScanf", ask, [](S on) { return viScanf(on.handle, "%d", &value32); }},
    {"viSetAttribute", nothing, [](S on) { return viSetAttribute(on.handle, VI_ATTR_USER_DATA, 1); }},
    {"viSetBuf", nothing, [](S on) { return viSetBuf(on.handle, VI_READ_BUF | VI_WRITE_BUF, 8192); }},
    {"viStatusDesc", nothing, [](S on) { return viStatusDesc(on.handle, VI_ERROR_TMO, text.data()); }},
    {"viTerminate", nothing, [](S on) { return viTerminate(on.handle, VI_NULL, VI_NULL); }},
    {"viUninstallHandler", install, [](S on) { return viUninstallHandler(on.handle, VI_EVENT_IO_COMPLETION, handler, nullptr); }},
    {"viUnlock", lockIt, [](S on) { return viUnlock(on.handle); }},
    {"viUnmapAddress", nothing, [](S on) { return viUnmapAddress(on.handle); }},
    {"viUnmapTrigger", nothing, [](S on) { return viUnmapTrigger(on.handle, VI_TRIG_TTL0, VI_TRIG_TTL1); }},
    {"viUsbControlIn", nothing, [](S on) { return viUsbControlIn(on.handle, 0, 0, 0, 0, 8, buffer.data(), &value16); }},
    {"viUsbControlOut", nothing, [](S on) { return viUsbControlOut(on.handle, 0, 0, 0, 0, 8, buffer.data()); }},
    {"viVPrintf", addressListener, [](S on) { return vprintf(on, "*ESE %d\n", 1); }},
    {"viVQueryf", ask, [](S on) { return vqueryf(on, on.isInterface ? "" : "*ESE?\n", "%d", &value32); }},
    {"viVSPrintf", nothing, [](S on) { return vsprintf(on, "%d", 1); }},
    {"viVSScanf", nothing, [](S on) { return vsscanf(on, "1", "%d", &value32); }},
    {"viVScanf", ask, [](S on) { return vscanf(on, "%d", &value32); }},
    {"viVxiCommandQuery", nothing, [](S on) { return viVxiCommandQuery(on.handle, VI_VXI_CMD16, 0, &value32); }},
    {"viWaitOnEvent", transferAndNotify, [](S on) { return viWaitOnEvent(on.handle, VI_EVENT_IO_COMPLETION, 20000, nullptr, nullptr); }},
    {"viWrite", addressListener, [](S on) { return viWrite(on.handle, reinterpret_cast<ViConstBuf>("*CLS\n"), 5, &count); }},
    {"viWriteAsync", addressListener, [](S on) { return viWriteAsync(on.handle, reinterpret_cast<ViConstBuf>("*CLS\n"), 5, &job); }},
    {"viWriteFromFile", saveFile, [](S on) { return viWriteFromFile(on.handle, on.file.c_str(), 5, &count); }},
};
// clang-format on

} // namespace

const std::vector<Operation> &all()
{
    return table;
}

std::vector<std::string> exportedNames()
{
    std::vector<std::string> names;
    std::ifstream list(EXPORTED_NAMES);
    for (std::string line; std::getline(list, line);)
        if (line.starts_with("vi") && line.find(' ') == std::string::npos)
            names.push_back(line);
    return names;
}

std::string statusName(ViStatus status)
{
#define NAME_OF(name, sentence)                                                                                        \
    if (status == name)                                                                                                \
        return #name;
    KYVISA_STATUS_TABLE(NAME_OF)
#undef NAME_OF
    return std::to_string(status);
}

} // namespace operations
