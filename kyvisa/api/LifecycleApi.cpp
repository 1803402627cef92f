#include "kyvisa/api/Call.h"
#include "kyvisa/core/FindList.h"

using namespace kyvisa;
using namespace kyvisa::api;

ViStatus viOpenDefaultRM(ViPSession sesn)
{
    return Call("viOpenDefaultRM", Out{sesn}).timed().anywhere([&]() -> ViStatus {
        if (!sesn)
            return VI_ERROR_INV_PARAMETER;
        *sesn = VI_NULL;
        Library &library = Library::instance();
        const auto manager = std::make_shared<ResourceManager>(library);
        const ViSession handle = library.handles.insert(manager, VI_NULL);
        if (handle == 0)
            return VI_ERROR_ALLOC;
        manager->setHandle(handle);
        *sesn = handle;
        return VI_SUCCESS;
    });
}

ViStatus viGetDefaultRM(ViPSession sesn)
{
    return viOpenDefaultRM(sesn);
}

ViStatus viOpen(ViSession sesn, ViConstRsrc name, ViAccessMode mode, ViUInt32 timeout, ViPSession vi)
{
    return Call("viOpen", sesn, name, mode, timeout, Out{vi})
        .onResourceManager(sesn, [&](ResourceManager &manager) -> ViStatus {
            return vi ? manager.open(name, mode, timeout, *vi) : VI_ERROR_INV_PARAMETER;
        });
}

ViStatus viClose(ViObject vi)
{
    return Call("viClose", vi).anywhere([&]() -> ViStatus {
        if (vi == VI_NULL)
            return VI_WARN_NULL_OBJECT;
        ObjectPointer object = Library::instance().handles.remove(vi);
        return object ? Object::dispose(std::move(object)) : VI_ERROR_INV_OBJECT;
    });
}

ViStatus viFindRsrc(ViSession sesn, ViConstString expr, ViPFindList findList, ViPUInt32 retCnt, ViChar desc[])
{
    return Call("viFindRsrc", sesn, expr, Out{findList}, Out{retCnt}, OutText{desc})
        .onResourceManager(
            sesn, [&](ResourceManager &manager) { return manager.findResources(expr, findList, retCnt, desc); });
}

ViStatus viFindNext(ViFindList findList, ViChar desc[])
{
    return Call("viFindNext", findList, OutText{desc}).on(findList, [&](Object &object) -> ViStatus {
        FindList *list = object.asFindList();
        if (!list)
            return VI_ERROR_NSUP_OPER;
        return desc ? list->next(desc) : VI_ERROR_INV_PARAMETER;
    });
}

ViStatus viParseRsrc(ViSession sesn, ViConstRsrc rsrcName, ViPUInt16 intfType, ViPUInt16 intfNum)
{
    return viParseRsrcEx(sesn, rsrcName, intfType, intfNum, nullptr, nullptr, nullptr);
}

ViStatus viParseRsrcEx(ViSession sesn, ViConstRsrc rsrcName, ViPUInt16 intfType, ViPUInt16 intfNum, ViChar rsrcClass[],
                       ViChar expandedUnaliasedName[], ViChar aliasIfExists[])
{
    return Call("viParseRsrcEx", sesn, rsrcName, Out{intfType}, Out{intfNum}, OutText{rsrcClass},
                OutText{expandedUnaliasedName}, OutText{aliasIfExists})
        .onResourceManager(sesn, [&](ResourceManager &manager) -> ViStatus {
            if (!intfType || !intfNum)
                return VI_ERROR_INV_PARAMETER;
            return manager.parse(rsrcName, *intfType, *intfNum, rsrcClass, expandedUnaliasedName, aliasIfExists);
        });
}
