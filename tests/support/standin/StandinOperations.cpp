// The operations on an open session.
#include "support/standin/StandinState.h"

#include <visa.h>

#include <algorithm>
#include <cstdio>
#include <cstring>

using namespace standin;

namespace
{

std::uint64_t addressOf(const void *pointer)
{
    return reinterpret_cast<std::uintptr_t>(pointer);
}

bool isSession(ViSession vi)
{
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    return state.sessions.contains(vi);
}

/// An operation that has nothing but a status to answer.
ViStatus plain(Call call)
{
    const ViSession vi = call.handle;
    const Answer answer = enter(std::move(call));
    if (!isFriendly(answer))
        return *answer.status;
    return isSession(vi) ? answer.status.value_or(VI_SUCCESS) : VI_ERROR_INV_OBJECT;
}

/// An instrument that got @p text: the next read answers what it was promised to answer.
void receive(std::string text)
{
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    while (!text.empty() && (text.back() == '\n' || text.back() == '\r'))
        text.pop_back();
    if (const auto reply = state.replies.find(text); reply != state.replies.end())
        state.unread = reply->second;
}

// The formats are those of the code under test, which these helpers only pass on.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral"

std::string formatted(ViConstString format, ViVAList arguments)
{
    char text[1024];
    va_list copy;
    va_copy(copy, arguments);
    std::vsnprintf(text, sizeof text, format, copy);
    va_end(copy);
    return text;
}

void scan(const std::string &input, ViConstString format, ViVAList results)
{
    if (!input.empty())
        std::vsscanf(input.c_str(), format, results);
}

#pragma GCC diagnostic pop

} // namespace

ViStatus viWrite(ViSession vi, ViConstBuf buf, ViUInt32 cnt, ViPUInt32 retCnt)
{
    const std::string bytes(reinterpret_cast<const char *>(buf), cnt);
    const Answer answer = enter({.operation = "viWrite",
                                 .handle = vi,
                                 .numbers = {cnt},
                                 .texts = {bytes},
                                 .outputsBefore = {retCnt ? *retCnt : 0}});
    if (!isFriendly(answer)) {
        putNumber(retCnt, answer, 0);
        return *answer.status;
    }
    if (!isSession(vi))
        return VI_ERROR_INV_OBJECT;
    receive(bytes);
    if (retCnt != nullptr)
        *retCnt = cnt;
    return answer.status.value_or(VI_SUCCESS);
}

ViStatus viRead(ViSession vi, ViPBuf buf, ViUInt32 cnt, ViPUInt32 retCnt)
{
    const Answer answer =
        enter({.operation = "viRead", .handle = vi, .numbers = {cnt}, .outputsBefore = {retCnt ? *retCnt : 0}});
    if (!isFriendly(answer)) {
        const std::size_t length = std::min<std::size_t>(answer.bytes.size(), cnt);
        std::copy_n(answer.bytes.begin(), length, buf);
        if (retCnt != nullptr && !answer.bytes.empty())
            *retCnt = static_cast<ViUInt32>(length);
        putNumber(retCnt, answer, 0);
        return *answer.status;
    }
    if (!isSession(vi))
        return VI_ERROR_INV_OBJECT;
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    if (state.unread.empty())
        return answer.status.value_or(VI_ERROR_TMO);
    const std::size_t length = std::min<std::size_t>(state.unread.size(), cnt);
    std::copy_n(state.unread.begin(), length, buf);
    state.unread.erase(0, length);
    if (retCnt != nullptr)
        *retCnt = static_cast<ViUInt32>(length);
    return answer.status.value_or(state.unread.empty() ? VI_SUCCESS : VI_SUCCESS_MAX_CNT);
}

ViStatus viVPrintf(ViSession vi, ViConstString writeFmt, ViVAList params)
{
    return plain({.operation = "viVPrintf", .handle = vi, .texts = {writeFmt, formatted(writeFmt, params)}});
}

ViStatus viVScanf(ViSession vi, ViConstString readFmt, ViVAList params)
{
    const Answer answer = enter({.operation = "viVScanf", .handle = vi, .texts = {readFmt}});
    scan(answer.bytes, readFmt, params);
    if (!isFriendly(answer))
        return *answer.status;
    return isSession(vi) ? answer.status.value_or(VI_SUCCESS) : VI_ERROR_INV_OBJECT;
}

ViStatus viVQueryf(ViSession vi, ViConstString writeFmt, ViConstString readFmt, ViVAList params)
{
    const Answer answer = enter({.operation = "viVQueryf", .handle = vi, .texts = {writeFmt, readFmt}});
    scan(answer.bytes, readFmt, params);
    if (!isFriendly(answer))
        return *answer.status;
    return isSession(vi) ? answer.status.value_or(VI_SUCCESS) : VI_ERROR_INV_OBJECT;
}

ViStatus viReadSTB(ViSession vi, ViPUInt16 status)
{
    const Answer answer = enter({.operation = "viReadSTB", .handle = vi, .outputsBefore = {*status}});
    putNumber(status, answer, 0);
    if (!isFriendly(answer))
        return *answer.status;
    return isSession(vi) ? answer.status.value_or(VI_SUCCESS) : VI_ERROR_INV_OBJECT;
}

ViStatus viAssertTrigger(ViSession vi, ViUInt16 protocol)
{
    return plain({.operation = "viAssertTrigger", .handle = vi, .numbers = {protocol}});
}

ViStatus viClear(ViSession vi)
{
    return plain({.operation = "viClear", .handle = vi});
}

ViStatus viLock(ViSession vi, ViAccessMode lockType, ViUInt32 timeout, ViConstKeyId requestedKey, ViChar accessKey[])
{
    const Answer answer = enter({.operation = "viLock",
                                 .handle = vi,
                                 .numbers = {lockType, timeout, addressOf(requestedKey), addressOf(accessKey)},
                                 .texts = {textOf(requestedKey)},
                                 .outputsBefore = {accessKey ? static_cast<unsigned char>(accessKey[0]) : 0u}});
    if (!isFriendly(answer)) {
        if (!answer.bytes.empty())
            copyText(accessKey, answer.bytes);
        return *answer.status;
    }
    if (!isSession(vi))
        return VI_ERROR_INV_OBJECT;
    copyText(accessKey, requestedKey != nullptr ? requestedKey : "standin-key");
    return answer.status.value_or(VI_SUCCESS);
}

ViStatus viUnlock(ViSession vi)
{
    return plain({.operation = "viUnlock", .handle = vi});
}

ViStatus viEnableEvent(ViSession vi, ViEventType eventType, ViUInt16 mechanism, ViEventFilter context)
{
    return plain({.operation = "viEnableEvent", .handle = vi, .numbers = {eventType, mechanism, context}});
}

ViStatus viDisableEvent(ViSession vi, ViEventType eventType, ViUInt16 mechanism)
{
    return plain({.operation = "viDisableEvent", .handle = vi, .numbers = {eventType, mechanism}});
}

ViStatus viDiscardEvents(ViSession vi, ViEventType eventType, ViUInt16 mechanism)
{
    return plain({.operation = "viDiscardEvents", .handle = vi, .numbers = {eventType, mechanism}});
}

ViStatus viWaitOnEvent(ViSession vi, ViEventType inEventType, ViUInt32 timeout, ViPEventType outEventType,
                       ViPEvent outContext)
{
    const Answer answer = enter({.operation = "viWaitOnEvent",
                                 .handle = vi,
                                 .numbers = {inEventType, timeout},
                                 .outputsBefore = {outEventType ? *outEventType : 0, outContext ? *outContext : 0}});
    if (isFriendly(answer))
        return isSession(vi) ? answer.status.value_or(VI_ERROR_TMO) : VI_ERROR_INV_OBJECT;
    putNumber(outEventType, answer, 0);
    putNumber(outContext, answer, 1);
    if (answer.numbers.size() > 1) {
        State &state = State::instance();
        const std::lock_guard lock(state.mutex);
        state.contexts.insert(static_cast<ViEvent>(answer.numbers[1]));
    }
    return *answer.status;
}

ViStatus viInstallHandler(ViSession vi, ViEventType eventType, ViHndlr handler, ViAddr userHandle)
{
    const ViStatus status =
        plain({.operation = "viInstallHandler",
               .handle = vi,
               .numbers = {eventType, reinterpret_cast<std::uintptr_t>(handler), addressOf(userHandle)}});
    if (status >= 0) {
        State &state = State::instance();
        const std::lock_guard lock(state.mutex);
        state.handlers.push_back({vi, eventType, handler, userHandle});
    }
    return status;
}

ViStatus viUninstallHandler(ViSession vi, ViEventType eventType, ViHndlr handler, ViAddr userHandle)
{
    const ViStatus status =
        plain({.operation = "viUninstallHandler",
               .handle = vi,
               .numbers = {eventType, reinterpret_cast<std::uintptr_t>(handler), addressOf(userHandle)}});
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    std::erase_if(state.handlers, [&](const Handler &installed) {
        return installed.vi == vi && installed.type == eventType && installed.handler == handler &&
               installed.userHandle == userHandle;
    });
    return status;
}

ViStatus viGpibControlREN(ViSession vi, ViUInt16 mode)
{
    return plain({.operation = "viGpibControlREN", .handle = vi, .numbers = {mode}});
}

ViStatus viGpibControlATN(ViSession vi, ViUInt16 mode)
{
    return plain({.operation = "viGpibControlATN", .handle = vi, .numbers = {mode}});
}

ViStatus viGpibSendIFC(ViSession vi)
{
    return plain({.operation = "viGpibSendIFC", .handle = vi});
}

ViStatus viGpibCommand(ViSession vi, ViConstBuf cmd, ViUInt32 cnt, ViPUInt32 retCnt)
{
    const Answer answer = enter({.operation = "viGpibCommand",
                                 .handle = vi,
                                 .numbers = {cnt},
                                 .texts = {std::string(reinterpret_cast<const char *>(cmd), cnt)},
                                 .outputsBefore = {retCnt ? *retCnt : 0}});
    if (!isFriendly(answer)) {
        putNumber(retCnt, answer, 0);
        return *answer.status;
    }
    if (!isSession(vi))
        return VI_ERROR_INV_OBJECT;
    if (retCnt != nullptr)
        *retCnt = cnt;
    return answer.status.value_or(VI_SUCCESS);
}

#ifndef STANDIN_WITHOUT_PASS_CONTROL
ViStatus viGpibPassControl(ViSession vi, ViUInt16 primAddr, ViUInt16 secAddr)
{
    return plain({.operation = "viGpibPassControl", .handle = vi, .numbers = {primAddr, secAddr}});
}
#endif

ViStatus viIn32(ViSession vi, ViUInt16 space, ViBusAddress offset, ViPUInt32 val32)
{
    const Answer answer = enter(
        {.operation = "viIn32", .handle = vi, .numbers = {space, offset, addressOf(val32)}, .outputsBefore = {*val32}});
    putNumber(val32, answer, 0);
    if (!isFriendly(answer))
        return *answer.status;
    return isSession(vi) ? answer.status.value_or(VI_SUCCESS) : VI_ERROR_INV_OBJECT;
}
