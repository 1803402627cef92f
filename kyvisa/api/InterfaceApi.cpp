#include "kyvisa/api/Call.h"

#include <span>

using namespace kyvisa;
using namespace kyvisa::api;

ViStatus viGpibControlREN(ViSession vi, ViUInt16 mode)
{
    return Call("viGpibControlREN", vi, mode).onInstrument(vi, [&](InstrumentSession &session) {
        return session.controlRemote(mode);
    });
}

ViStatus viGpibControlATN(ViSession vi, ViUInt16 mode)
{
    return Call("viGpibControlATN", vi, mode).onInstrument(vi, [&](InstrumentSession &session) {
        return session.controlAttention(mode);
    });
}

ViStatus viGpibSendIFC(ViSession vi)
{
    return Call("viGpibSendIFC", vi).onInstrument(vi, [](InstrumentSession &session) {
        return session.clearInterface();
    });
}

ViStatus viGpibCommand(ViSession vi, ViConstBuf cmd, ViUInt32 cnt, ViPUInt32 retCnt)
{
    storeIfWanted<ViUInt32>(retCnt, 0);
    return Call("viGpibCommand", vi, Bytes{cmd, cnt}, cnt, Out{retCnt})
        .onInstrument(vi, [&](InstrumentSession &session) -> ViStatus {
            if (!cmd && cnt > 0)
                return VI_ERROR_USER_BUF;
            std::size_t count = 0;
            const ViStatus status = session.sendCommands(std::as_bytes(std::span(cmd, cnt)), count);
            storeIfWanted(retCnt, static_cast<ViUInt32>(count));
            return status;
        });
}

ViStatus viGpibPassControl(ViSession vi, ViUInt16 primAddr, ViUInt16 secAddr)
{
    return Call("viGpibPassControl", vi, primAddr, secAddr).onInstrument(vi, [&](InstrumentSession &session) {
        return session.passControl(primAddr, secAddr);
    });
}

ViStatus viVxiCommandQuery(ViSession vi, ViUInt16, ViUInt32, ViPUInt32)
{
    return unsupported(vi, "viVxiCommandQuery");
}

ViStatus viAssertUtilSignal(ViSession vi, ViUInt16)
{
    return unsupported(vi, "viAssertUtilSignal");
}

ViStatus viAssertIntrSignal(ViSession vi, ViInt16, ViUInt32)
{
    return unsupported(vi, "viAssertIntrSignal");
}

ViStatus viMapTrigger(ViSession vi, ViInt16, ViInt16, ViUInt16)
{
    return unsupported(vi, "viMapTrigger");
}

ViStatus viUnmapTrigger(ViSession vi, ViInt16, ViInt16)
{
    return unsupported(vi, "viUnmapTrigger");
}

ViStatus viUsbControlOut(ViSession vi, ViInt16, ViInt16, ViUInt16, ViUInt16, ViUInt16, ViConstBuf)
{
    return unsupported(vi, "viUsbControlOut");
}

ViStatus viUsbControlIn(ViSession vi, ViInt16, ViInt16, ViUInt16, ViUInt16, ViUInt16, ViPBuf, ViPUInt16)
{
    return unsupported(vi, "viUsbControlIn");
}

ViStatus viPxiReserveTriggers(ViSession vi, ViInt16, ViAInt16, ViAInt16, ViPInt16)
{
    return unsupported(vi, "viPxiReserveTriggers");
}
