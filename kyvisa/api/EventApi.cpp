#include "kyvisa/api/Call.h"
#include "kyvisa/core/EventContext.h"

using namespace kyvisa;
using namespace kyvisa::api;

namespace
{

/// Sessions other than those on instruments have no events: for them every type is an invalid one. Those of a session that
/// a fork inherited are its parent's.
template <typename Called, typename Work>
ViStatus onEvents(const Called &call, ViSession vi, const Work &work)
{
    return call.onInstrument(
        vi,
        [&](InstrumentSession &session) -> ViStatus {
            return session.inherited() ? VI_ERROR_CONN_LOST : work(session);
        },
        VI_ERROR_INV_EVENT);
}

} // namespace

ViStatus viEnableEvent(ViSession vi, ViEventType eventType, ViUInt16 mechanism, ViEventFilter context)
{
    return onEvents(Call("viEnableEvent", vi, eventType, mechanism, context), vi,
                    [&](InstrumentSession &session) { return session.enableEvent(eventType, mechanism, context); });
}

ViStatus viDisableEvent(ViSession vi, ViEventType eventType, ViUInt16 mechanism)
{
    return onEvents(Call("viDisableEvent", vi, eventType, mechanism), vi,
                    [&](InstrumentSession &session) { return session.events().disable(eventType, mechanism); });
}

ViStatus viDiscardEvents(ViSession vi, ViEventType eventType, ViUInt16 mechanism)
{
    return onEvents(Call("viDiscardEvents", vi, eventType, mechanism), vi,
                    [&](InstrumentSession &session) { return session.events().discard(eventType, mechanism); });
}

ViStatus viWaitOnEvent(ViSession vi, ViEventType inEventType, ViUInt32 timeout, ViPEventType outEventType,
                       ViPEvent outContext)
{
    storeIfWanted<ViEventType>(outEventType, 0);
    storeIfWanted<ViEvent>(outContext, VI_NULL);
    return onEvents(Call("viWaitOnEvent", vi, inEventType, timeout, Out{outEventType}, Out{outContext}), vi,
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
                        *outContext =
                            Library::instance().handles.insert(std::make_shared<EventContext>(event), manager);
                        return *outContext != 0 ? status : VI_ERROR_ALLOC;
                    });
}

ViStatus viInstallHandler(ViSession vi, ViEventType eventType, ViHndlr handler, ViAddr userHandle)
{
    return onEvents(
        Call("viInstallHandler", vi, eventType, Address{reinterpret_cast<const void *>(handler)}, Address{userHandle}),
        vi, [&](InstrumentSession &session) { return session.events().install(eventType, handler, userHandle); });
}

ViStatus viUninstallHandler(ViSession vi, ViEventType eventType, ViHndlr handler, ViAddr userHandle)
{
    return onEvents(
        Call("viUninstallHandler", vi, eventType, Address{reinterpret_cast<const void *>(handler)},
             Address{userHandle}),
        vi, [&](InstrumentSession &session) { return session.events().uninstall(eventType, handler, userHandle); });
}
