#include "kyvisa/api/Call.h"
#include "kyvisa/core/StatusText.h"

#include <cstdio>
#include <cstring>

using namespace kyvisa;
using namespace kyvisa::api;

ViStatus viGetAttribute(ViObject vi, ViAttr attrName, void *attrValue)
{
    return Call("viGetAttribute", vi, attrName, Address{attrValue}).on(vi, [&](Object &object) {
        return object.getAttribute(attrName, attrValue);
    });
}

ViStatus viSetAttribute(ViObject vi, ViAttr attrName, ViAttrState attrValue)
{
    return Call("viSetAttribute", vi, attrName, attrValue).on(vi, [&](Object &object) {
        const ViStatus status = object.setAttribute(attrName, attrValue);
        InstrumentSession *session = object.asInstrument();
        return session ? reported(*session, "viSetAttribute", status) : status;
    });
}

// The handle is not looked at: a program asks what went wrong also when it has no session.
ViStatus viStatusDesc(ViObject vi, ViStatus status, ViChar desc[])
{
    return Call("viStatusDesc", vi, status, OutText{desc}).anywhere([&]() -> ViStatus {
        if (!desc)
            return VI_ERROR_INV_PARAMETER;
        if (const char *text = statusText(status)) {
            std::strcpy(desc, text);
            return VI_SUCCESS;
        }
        std::snprintf(desc, MaxAttributeText, "Unknown status 0x%08X.", static_cast<unsigned>(status));
        return VI_WARN_UNKNOWN_STATUS;
    });
}

ViStatus viTerminate(ViObject vi, ViUInt16 degree, ViJobId jobId)
{
    return Call("viTerminate", vi, degree, jobId).onInstrument(vi, [&](InstrumentSession &session) {
        return session.terminate(degree, jobId);
    });
}

ViStatus viLock(ViSession vi, ViAccessMode lockType, ViUInt32 timeout, ViConstKeyId requestedKey, ViChar accessKey[])
{
    return Call("viLock", vi, lockType, timeout, requestedKey, OutText{accessKey})
        .onInstrument(
            vi, [&](InstrumentSession &session) { return session.lock(lockType, timeout, requestedKey, accessKey); });
}

ViStatus viUnlock(ViSession vi)
{
    return Call("viUnlock", vi).onInstrument(vi, [](InstrumentSession &session) { return session.unlock(); });
}
