#include "kyvisa/api/Entry.h"
#include "kyvisa/core/EventContext.h"

using namespace kyvisa;
using namespace kyvisa::api;

// Sessions other than those on instruments have no events: for them every type is an invalid one.

ViStatus viEnableEvent(ViSession vi, ViEventType eventType, ViUInt16 mechanism, ViEventFilter context)
{
    return onInstrument(
        vi, "viEnableEvent",
        [&](InstrumentSession &session) { return session.enableEvent(eventType, mechanism, context); },
        VI_ERROR_INV_EVENT);
}

ViStatus viDisableEvent(ViSession vi, ViEventType eventType, ViUInt16 mechanism)
{
    return onInstrument(
        vi, "viDisableEvent",
        [&](InstrumentSession &session) { return session.events().disable(eventType, mechanism); }, VI_ERROR_INV_EVENT);
}

ViStatus viDiscardEvents(ViSession vi, ViEventType eventType, ViUInt16 mechanism)
{
    return onInstrument(
        vi, "viDiscardEvents",
        [&](InstrumentSession &session) { return session.events().discard(eventType, mechanism); }, VI_ERROR_INV_EVENT);
}

ViStatus viWaitOnEvent(ViSession vi, ViEventType inEventType, ViUInt32 timeout, ViPEventType outEventType,
                       ViPEvent outContext)
{
    storeIfWanted<ViEventType>(outEventType, 0);
    storeIfWanted<ViEvent>(outContext, VI_NULL);
    return onInstrument(
        vi, "viWaitOnEvent",
        [&](InstrumentSession &session) -> ViStatus {
            Event event;
            const ViStatus status = session.events().wait(inEventType, timeout, event);
            if (status < VI_SUCCESS)
                return status;
            storeIfWanted(outEventType, event.type);
            if (!outContext)
                return status;
            ViSession manager = VI_NULL;
            session.getAttribute(VI_ATTR_RM_SESSION, &manager);
            *outContext = Library::instance().handles.insert(std::make_shared<EventContext>(event), manager);
            return *outContext != 0 ? status : VI_ERROR_ALLOC;
        },
        VI_ERROR_INV_EVENT);
}

ViStatus viInstallHandler(ViSession vi, ViEventType eventType, ViHndlr handler, ViAddr userHandle)
{
    return onInstrument(
        vi, "viInstallHandler",
        [&](InstrumentSession &session) { return session.events().install(eventType, handler, userHandle); },
        VI_ERROR_INV_EVENT);
}

ViStatus viUninstallHandler(ViSession vi, ViEventType eventType, ViHndlr handler, ViAddr userHandle)
{
    return onInstrument(
        vi, "viUninstallHandler",
        [&](InstrumentSession &session) { return session.events().uninstall(eventType, handler, userHandle); },
        VI_ERROR_INV_EVENT);
}
