// A VISA library that does nothing: what the logged session costs above it is the logged session's own.

#include <visa.h>

#include <cstdarg>

// Not inlined and not empty for the optimiser: a call into another object, as into a shared library.
ViStatus viWrite(ViSession, ViConstBuf, ViUInt32 count, ViPUInt32 written)
{
    *written = count;
    return VI_SUCCESS;
}

ViStatus viOpenDefaultRM(ViPSession manager)
{
    *manager = 1;
    return VI_SUCCESS;
}

ViStatus viOpen(ViSession, ViConstRsrc, ViAccessMode, ViUInt32, ViPSession session)
{
    *session = 2;
    return VI_SUCCESS;
}

#define IDLE(name, ...)                                                                                                \
    ViStatus name(__VA_ARGS__)                                                                                         \
    {                                                                                                                  \
        return VI_SUCCESS;                                                                                             \
    }

IDLE(viClose, ViObject)
IDLE(viFindRsrc, ViSession, ViConstString, ViPFindList, ViPUInt32, ViChar[])
IDLE(viFindNext, ViFindList, ViChar[])
IDLE(viRead, ViSession, ViPBuf, ViUInt32, ViPUInt32)
IDLE(viVPrintf, ViSession, ViConstString, ViVAList)
IDLE(viVScanf, ViSession, ViConstString, ViVAList)
IDLE(viVQueryf, ViSession, ViConstString, ViConstString, ViVAList)
IDLE(viReadSTB, ViSession, ViPUInt16)
IDLE(viAssertTrigger, ViSession, ViUInt16)
IDLE(viClear, ViSession)
IDLE(viSetAttribute, ViObject, ViAttr, ViAttrState)
IDLE(viGetAttribute, ViObject, ViAttr, void *)
IDLE(viLock, ViSession, ViAccessMode, ViUInt32, ViConstKeyId, ViChar[])
IDLE(viUnlock, ViSession)
IDLE(viEnableEvent, ViSession, ViEventType, ViUInt16, ViEventFilter)
IDLE(viDisableEvent, ViSession, ViEventType, ViUInt16)
IDLE(viDiscardEvents, ViSession, ViEventType, ViUInt16)
IDLE(viWaitOnEvent, ViSession, ViEventType, ViUInt32, ViPEventType, ViPEvent)
IDLE(viInstallHandler, ViSession, ViEventType, ViHndlr, ViAddr)
IDLE(viUninstallHandler, ViSession, ViEventType, ViHndlr, ViAddr)
IDLE(viGpibControlREN, ViSession, ViUInt16)
IDLE(viGpibControlATN, ViSession, ViUInt16)
IDLE(viGpibSendIFC, ViSession)
IDLE(viGpibCommand, ViSession, ViConstBuf, ViUInt32, ViPUInt32)
IDLE(viGpibPassControl, ViSession, ViUInt16, ViUInt16)
IDLE(viIn32, ViSession, ViUInt16, ViBusAddress, ViPUInt32)
