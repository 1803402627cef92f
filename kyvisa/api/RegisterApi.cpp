#include "kyvisa/api/Call.h"

using namespace kyvisa;
using namespace kyvisa::api;

// Register access belongs to interfaces with memory (VXI, GPIB-VXI, PXI). This library has no session of that kind.

ViStatus viIn8(ViSession vi, ViUInt16, ViBusAddress, ViPUInt8)
{
    return unsupported(vi, "viIn8");
}

ViStatus viOut8(ViSession vi, ViUInt16, ViBusAddress, ViUInt8)
{
    return unsupported(vi, "viOut8");
}

ViStatus viIn16(ViSession vi, ViUInt16, ViBusAddress, ViPUInt16)
{
    return unsupported(vi, "viIn16");
}

ViStatus viOut16(ViSession vi, ViUInt16, ViBusAddress, ViUInt16)
{
    return unsupported(vi, "viOut16");
}

ViStatus viIn32(ViSession vi, ViUInt16, ViBusAddress, ViPUInt32)
{
    return unsupported(vi, "viIn32");
}

ViStatus viOut32(ViSession vi, ViUInt16, ViBusAddress, ViUInt32)
{
    return unsupported(vi, "viOut32");
}

ViStatus viIn64(ViSession vi, ViUInt16, ViBusAddress, ViPUInt64)
{
    return unsupported(vi, "viIn64");
}

ViStatus viOut64(ViSession vi, ViUInt16, ViBusAddress, ViUInt64)
{
    return unsupported(vi, "viOut64");
}

ViStatus viIn8Ex(ViSession vi, ViUInt16, ViBusAddress64, ViPUInt8)
{
    return unsupported(vi, "viIn8Ex");
}

ViStatus viOut8Ex(ViSession vi, ViUInt16, ViBusAddress64, ViUInt8)
{
    return unsupported(vi, "viOut8Ex");
}

ViStatus viIn16Ex(ViSession vi, ViUInt16, ViBusAddress64, ViPUInt16)
{
    return unsupported(vi, "viIn16Ex");
}

ViStatus viOut16Ex(ViSession vi, ViUInt16, ViBusAddress64, ViUInt16)
{
    return unsupported(vi, "viOut16Ex");
}

ViStatus viIn32Ex(ViSession vi, ViUInt16, ViBusAddress64, ViPUInt32)
{
    return unsupported(vi, "viIn32Ex");
}

ViStatus viOut32Ex(ViSession vi, ViUInt16, ViBusAddress64, ViUInt32)
{
    return unsupported(vi, "viOut32Ex");
}

ViStatus viIn64Ex(ViSession vi, ViUInt16, ViBusAddress64, ViPUInt64)
{
    return unsupported(vi, "viIn64Ex");
}

ViStatus viOut64Ex(ViSession vi, ViUInt16, ViBusAddress64, ViUInt64)
{
    return unsupported(vi, "viOut64Ex");
}

ViStatus viMoveIn8(ViSession vi, ViUInt16, ViBusAddress, ViBusSize, ViAUInt8)
{
    return unsupported(vi, "viMoveIn8");
}

ViStatus viMoveOut8(ViSession vi, ViUInt16, ViBusAddress, ViBusSize, ViAUInt8)
{
    return unsupported(vi, "viMoveOut8");
}

ViStatus viMoveIn16(ViSession vi, ViUInt16, ViBusAddress, ViBusSize, ViAUInt16)
{
    return unsupported(vi, "viMoveIn16");
}

ViStatus viMoveOut16(ViSession vi, ViUInt16, ViBusAddress, ViBusSize, ViAUInt16)
{
    return unsupported(vi, "viMoveOut16");
}

ViStatus viMoveIn32(ViSession vi, ViUInt16, ViBusAddress, ViBusSize, ViAUInt32)
{
    return unsupported(vi, "viMoveIn32");
}

ViStatus viMoveOut32(ViSession vi, ViUInt16, ViBusAddress, ViBusSize, ViAUInt32)
{
    return unsupported(vi, "viMoveOut32");
}

ViStatus viMoveIn64(ViSession vi, ViUInt16, ViBusAddress, ViBusSize, ViAUInt64)
{
    return unsupported(vi, "viMoveIn64");
}

ViStatus viMoveOut64(ViSession vi, ViUInt16, ViBusAddress, ViBusSize, ViAUInt64)
{
    return unsupported(vi, "viMoveOut64");
}

ViStatus viMoveIn8Ex(ViSession vi, ViUInt16, ViBusAddress64, ViBusSize, ViAUInt8)
{
    return unsupported(vi, "viMoveIn8Ex");
}

ViStatus viMoveOut8Ex(ViSession vi, ViUInt16, ViBusAddress64, ViBusSize, ViAUInt8)
{
    return unsupported(vi, "viMoveOut8Ex");
}

ViStatus viMoveIn16Ex(ViSession vi, ViUInt16, ViBusAddress64, ViBusSize, ViAUInt16)
{
    return unsupported(vi, "viMoveIn16Ex");
}

ViStatus viMoveOut16Ex(ViSession vi, ViUInt16, ViBusAddress64, ViBusSize, ViAUInt16)
{
    return unsupported(vi, "viMoveOut16Ex");
}

ViStatus viMoveIn32Ex(ViSession vi, ViUInt16, ViBusAddress64, ViBusSize, ViAUInt32)
{
    return unsupported(vi, "viMoveIn32Ex");
}

ViStatus viMoveOut32Ex(ViSession vi, ViUInt16, ViBusAddress64, ViBusSize, ViAUInt32)
{
    return unsupported(vi, "viMoveOut32Ex");
}

ViStatus viMoveIn64Ex(ViSession vi, ViUInt16, ViBusAddress64, ViBusSize, ViAUInt64)
{
    return unsupported(vi, "viMoveIn64Ex");
}

ViStatus viMoveOut64Ex(ViSession vi, ViUInt16, ViBusAddress64, ViBusSize, ViAUInt64)
{
    return unsupported(vi, "viMoveOut64Ex");
}

ViStatus viMove(ViSession vi, ViUInt16, ViBusAddress, ViUInt16, ViUInt16, ViBusAddress, ViUInt16, ViBusSize)
{
    return unsupported(vi, "viMove");
}

ViStatus viMoveAsync(ViSession vi, ViUInt16, ViBusAddress, ViUInt16, ViUInt16, ViBusAddress, ViUInt16, ViBusSize,
                     ViPJobId)
{
    return unsupported(vi, "viMoveAsync");
}

ViStatus viMoveEx(ViSession vi, ViUInt16, ViBusAddress64, ViUInt16, ViUInt16, ViBusAddress64, ViUInt16, ViBusSize)
{
    return unsupported(vi, "viMoveEx");
}

ViStatus viMoveAsyncEx(ViSession vi, ViUInt16, ViBusAddress64, ViUInt16, ViUInt16, ViBusAddress64, ViUInt16, ViBusSize,
                       ViPJobId)
{
    return unsupported(vi, "viMoveAsyncEx");
}

ViStatus viMapAddress(ViSession vi, ViUInt16, ViBusAddress, ViBusSize, ViBoolean, ViAddr, ViPAddr)
{
    return unsupported(vi, "viMapAddress");
}

ViStatus viUnmapAddress(ViSession vi)
{
    return unsupported(vi, "viUnmapAddress");
}

ViStatus viMapAddressEx(ViSession vi, ViUInt16, ViBusAddress64, ViBusSize, ViBoolean, ViAddr, ViPAddr)
{
    return unsupported(vi, "viMapAddressEx");
}

void viPeek8(ViSession, ViAddr, ViPUInt8 val8)
{
    storeIfWanted<ViUInt8>(val8, 0);
}

void viPoke8(ViSession, ViAddr, ViUInt8) {}

void viPeek16(ViSession, ViAddr, ViPUInt16 val16)
{
    storeIfWanted<ViUInt16>(val16, 0);
}

void viPoke16(ViSession, ViAddr, ViUInt16) {}

void viPeek32(ViSession, ViAddr, ViPUInt32 val32)
{
    storeIfWanted<ViUInt32>(val32, 0);
}

void viPoke32(ViSession, ViAddr, ViUInt32) {}

void viPeek64(ViSession, ViAddr, ViPUInt64 val64)
{
    storeIfWanted<ViUInt64>(val64, 0);
}

void viPoke64(ViSession, ViAddr, ViUInt64) {}

ViStatus viMemAlloc(ViSession vi, ViBusSize, ViPBusAddress)
{
    return unsupported(vi, "viMemAlloc");
}

ViStatus viMemFree(ViSession vi, ViBusAddress)
{
    return unsupported(vi, "viMemFree");
}

ViStatus viMemAllocEx(ViSession vi, ViBusSize, ViPBusAddress64)
{
    return unsupported(vi, "viMemAllocEx");
}

ViStatus viMemFreeEx(ViSession vi, ViBusAddress64)
{
    return unsupported(vi, "viMemFreeEx");
}
