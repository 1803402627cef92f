// The operations that open, find, close and describe objects.
#include "support/standin/StandinState.h"

#include <visa.h>

#include <cstring>

using namespace standin;

ViStatus viOpenDefaultRM(ViPSession sesn)
{
    const Answer answer = enter({.operation = "viOpenDefaultRM", .outputsBefore = {*sesn}});
    if (!isFriendly(answer)) {
        putNumber(sesn, answer, 0);
        return *answer.status;
    }
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    ++state.managers;
    *sesn = 1;
    return answer.status.value_or(VI_SUCCESS);
}

ViStatus viOpen(ViSession sesn, ViConstRsrc name, ViAccessMode mode, ViUInt32 timeout, ViPSession vi)
{
    const Answer answer = enter({.operation = "viOpen",
                                 .handle = sesn,
                                 .numbers = {mode, timeout},
                                 .texts = {textOf(name)},
                                 .outputsBefore = {*vi}});
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    if (!isFriendly(answer)) {
        putNumber(vi, answer, 0);
        if (*answer.status >= 0 && *vi != 0)
            state.sessions[*vi] = textOf(name);
        return *answer.status;
    }
    if (!state.isOpen(sesn))
        return VI_ERROR_INV_OBJECT;
    *vi = state.nextSession++;
    state.sessions[*vi] = textOf(name);
    return answer.status.value_or(VI_SUCCESS);
}

ViStatus viClose(ViObject vi)
{
    const Answer answer = enter({.operation = "viClose", .handle = vi});
    if (!isFriendly(answer))
        return *answer.status;
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    if (!state.isOpen(vi))
        return answer.status.value_or(VI_ERROR_INV_OBJECT);
    if (vi == 1)
        --state.managers;
    state.sessions.erase(vi);
    state.findLists.erase(vi);
    state.contexts.erase(vi);
    std::erase_if(state.handlers, [vi](const Handler &handler) { return handler.vi == vi; });
    return answer.status.value_or(VI_SUCCESS);
}

ViStatus viFindRsrc(ViSession sesn, ViConstString expr, ViPFindList findList, ViPUInt32 retCnt, ViChar desc[])
{
    const Answer answer =
        enter({.operation = "viFindRsrc",
               .handle = sesn,
               .texts = {textOf(expr)},
               .outputsBefore = {findList ? *findList : 0, retCnt ? *retCnt : 0, static_cast<unsigned char>(desc[0])}});
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    if (!isFriendly(answer)) {
        putNumber(findList, answer, 0);
        putNumber(retCnt, answer, 1);
        if (!answer.bytes.empty())
            copyText(desc, answer.bytes);
        return *answer.status;
    }
    if (!state.isOpen(sesn))
        return VI_ERROR_INV_OBJECT;
    if (state.resources.empty())
        return answer.status.value_or(VI_ERROR_RSRC_NFOUND);
    const ViFindList list = state.nextFindList++;
    state.findLists[list] = {};
    if (findList != nullptr)
        *findList = list;
    if (retCnt != nullptr)
        *retCnt = static_cast<ViUInt32>(state.resources.size());
    copyText(desc, state.resources.front().name);
    return answer.status.value_or(VI_SUCCESS);
}

ViStatus viFindNext(ViFindList findList, ViChar desc[])
{
    const Answer answer =
        enter({.operation = "viFindNext", .handle = findList, .outputsBefore = {static_cast<unsigned char>(desc[0])}});
    if (!isFriendly(answer)) {
        if (!answer.bytes.empty())
            copyText(desc, answer.bytes);
        return *answer.status;
    }
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    const auto list = state.findLists.find(findList);
    if (list == state.findLists.end())
        return VI_ERROR_INV_OBJECT;
    if (list->second.position + 1 >= state.resources.size())
        return VI_ERROR_RSRC_NFOUND;
    copyText(desc, state.resources[++list->second.position].name);
    return answer.status.value_or(VI_SUCCESS);
}

ViStatus viGetAttribute(ViObject vi, ViAttr attrName, void *attrValue)
{
    const bool isText = (attrName & 0x80000000u) != 0;
    const Answer answer = enter({.operation = "viGetAttribute",
                                 .handle = vi,
                                 .numbers = {attrName},
                                 .outputsBefore = {*static_cast<const unsigned char *>(attrValue)}});
    if (!isFriendly(answer)) {
        if (isText && !answer.bytes.empty())
            copyText(static_cast<ViChar *>(attrValue), answer.bytes);
        if (!isText && !answer.numbers.empty())
            std::memcpy(attrValue, &answer.numbers[0], sizeof answer.numbers[0]); // the caller gave 64 bits
        return *answer.status;
    }
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    if (!state.isOpen(vi))
        return VI_ERROR_INV_OBJECT;
    const AttributeValue *value = state.attribute(vi, attrName);
    if (value == nullptr)
        return answer.status.value_or(VI_ERROR_NSUP_ATTR);
    if (isText)
        copyText(static_cast<ViChar *>(attrValue), value->text);
    else
        std::memcpy(attrValue, &value->number, value->width); // little-endian hosts
    return answer.status.value_or(VI_SUCCESS);
}

ViStatus viSetAttribute(ViObject vi, ViAttr attrName, ViAttrState attrValue)
{
    const Answer answer = enter({.operation = "viSetAttribute", .handle = vi, .numbers = {attrName, attrValue}});
    if (!isFriendly(answer))
        return *answer.status;
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    if (!state.isOpen(vi))
        return VI_ERROR_INV_OBJECT;
    if ((attrName & 0x80000000u) != 0)
        return answer.status.value_or(VI_ERROR_ATTR_READONLY);
    state.attributes[attrName].number = attrValue;
    return answer.status.value_or(VI_SUCCESS);
}
