#include "kyvisa/api/Entry.h"

using namespace kyvisa;
using namespace kyvisa::api;

ViStatus viGpibControlREN(ViSession vi, ViUInt16 mode)
{
    return onInstrument(vi, "viGpibControlREN",
                        [&](InstrumentSession &session) { return session.controlRemote(mode); });
}

ViStatus viGpibControlATN(ViSession vi, ViUInt16)
{
    return unsupported(vi, "viGpibControlATN");
}

ViStatus viGpibSendIFC(ViSession vi)
{
    return unsupported(vi, "viGpibSendIFC");
}

ViStatus viGpibCommand(ViSession vi, ViConstBuf, ViUInt32, ViPUInt32)
{
    return unsupported(vi, "viGpibCommand");
}

ViStatus viGpibPassControl(ViSession vi, ViUInt16, ViUInt16)
{
    return unsupported(vi, "viGpibPassControl");
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
