#pragma once

#include "kyvisa/core/InstrumentSession.h"
#include "kyvisa/core/Library.h"
#include "kyvisa/core/ResourceManager.h"
#include "kyvisa/include/visa.h"

#include <exception>
#include <new>

/**
 * What every exported function does around its work: no C++ exception leaves the library, an unknown handle is refused
 * before anything else is looked at, and a failure reaches the session's exception handlers when no lock is held any more.
 */
namespace kyvisa::api
{

/// Runs @p work; what it throws becomes a status.
template <typename Work>
ViStatus guarded(const Work &work) noexcept
{
    try {
        return work();
    } catch (const std::bad_alloc &) {
        return VI_ERROR_ALLOC;
    } catch (...) {
        return VI_ERROR_SYSTEM_ERROR;
    }
}

template <typename Work>
ViStatus onObject(ViObject handle, const Work &work) noexcept
{
    return guarded([&]() -> ViStatus {
        const ObjectPointer object = Library::instance().handles.find(handle);
        return object ? work(*object) : VI_ERROR_INV_OBJECT;
    });
}

inline ViStatus reported(InstrumentSession &session, const char *operation, ViStatus status)
{
    // In a forked child the hub's mutex and threads are those of another process.
    if (status < VI_SUCCESS && !session.inherited())
        session.events().raiseException({.type = VI_EVENT_EXCEPTION, .status = status, .operation = operation});
    return status;
}

/// For operations of instrument sessions. @param otherwise what any other object answers.
template <typename Work>
ViStatus onInstrument(ViSession handle, const char *operation, const Work &work,
                      ViStatus otherwise = VI_ERROR_NSUP_OPER) noexcept
{
    return onObject(handle, [&](Object &object) {
        InstrumentSession *session = object.asInstrument();
        if (!session)
            return otherwise;
        return reported(*session, operation, guarded([&] { return work(*session); }));
    });
}

template <typename Work>
ViStatus onResourceManager(ViSession handle, const Work &work) noexcept
{
    return onObject(handle, [&](Object &object) {
        ResourceManager *manager = object.asResourceManager();
        return manager ? work(*manager) : VI_ERROR_NSUP_OPER;
    });
}

template <typename Value>
void storeIfWanted(Value *to, Value value)
{
    if (to)
        *to = value;
}

} // namespace kyvisa::api
