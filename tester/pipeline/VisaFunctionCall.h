#pragma once

#include <visatype.h>

#include <array>
#include <cstdint>
#include <string>

class _VisaFunctionCallHandlerListener;

/**
 * The kinds of call that travel between the panels and a session's worker.
 *
 * The numbers are fixed: panels, listeners and the worker all use them. All (0) is no operation but a wildcard: a
 * listener of All hears every call. End (42) is the end mark and is never sent.
 */
enum class VisaFunctionCallTyp : std::uint32_t {
    All = 0,
    FindRsrc = 1,
    FindNext = 2,
    ParseRsrc = 3,
    Open = 4,
    Close = 5,
    SetAttribute = 6,
    GetAttribute = 7,
    StatusDesc = 8,
    Terminate = 9,
    ExclusiveLock = 10,
    SharedLock = 11,
    Unlock = 12,
    EnableEvent = 13,
    DisableEvent = 14,
    DiscardEvents = 15,
    WaitOnEvent = 16,
    InstallHandler = 17,
    UninstallHandler = 18,
    Read = 19,
    ReadAsync = 20,
    ReadToFile = 21,
    Write = 22,
    WriteAsync = 23,
    Query = 24,
    WriteFromFile = 25,
    AssertTrigger = 26,
    ReadSTB = 27,
    Clear = 28,
    GpibControlREN = 29,
    GpibControlATN = 30,
    GpibSendIFC = 31,
    GpibCommand = 32,
    GpibPassControl = 33,
    VxiCommandQuery = 34,
    AssertUtilSignal = 35,
    AssertIntrSignal = 36,
    MapTrigger = 37,
    Test = 38,
    StopTest = 39,
    SetAttributeDef = 40,
    GetAttributeDef = 41,
    End = 42,
};

/// Display names, indexed by the value of VisaFunctionCallTyp; entry 42 is "End".
extern const char *const _VisaFunctionCallTypString[43];

/// One argument or result of a call. Which of the two members counts is decided by the kind of the call.
struct Parameter {
    std::uint64_t uintValue = 0;
    std::string stringValue; ///< any bytes, zero bytes included
};

/// One call: a request on its way to the worker, or the result on its way back. Requests and results have the same
/// shape.
struct _visaFunctionCall {
    VisaFunctionCallTyp type = VisaFunctionCallTyp::All;
    ViStatus status = 0; ///< 0 in a request; in a result the status of the failing operation or 0
    std::array<Parameter, 3> parameter;
};

/// A copy of a result, addressed to one listener.
struct finsihedFunctionCall {
    _visaFunctionCall call;
    _VisaFunctionCallHandlerListener *listener = nullptr; ///< not owned; null when the listener has gone meanwhile
};
