#include "kyvisa/api/Call.h"
#include "kyvisa/format/Arguments.h"
#include "kyvisa/format/TextBuffers.h"

#include <cstdarg>
#include <span>

using namespace kyvisa;
using namespace kyvisa::api;
using format::Arguments;

namespace
{

template <typename Called>
ViStatus print(const Called &call, ViSession vi, ViConstString text, Arguments &arguments)
{
    return call.onInstrument(vi,
                             [&](InstrumentSession &session) { return session.formatted().print(text, arguments); });
}

template <typename Called>
ViStatus printToText(const Called &call, ViSession vi, ViPBuf buffer, ViConstString text, Arguments &arguments)
{
    return call.onInstrument(vi, [&](InstrumentSession &) -> ViStatus {
        return buffer ? format::printToText(reinterpret_cast<char *>(buffer), text, arguments) : VI_ERROR_USER_BUF;
    });
}

template <typename Called>
ViStatus scan(const Called &call, ViSession vi, ViConstString text, Arguments &arguments)
{
    return call.onInstrument(vi, [&](InstrumentSession &session) { return session.formatted().scan(text, arguments); });
}

template <typename Called>
ViStatus scanText(const Called &call, ViSession vi, ViConstBuf buffer, ViConstString text, Arguments &arguments)
{
    return call.onInstrument(vi, [&](InstrumentSession &) -> ViStatus {
        return buffer ? format::scanText(reinterpret_cast<const char *>(buffer), text, arguments) : VI_ERROR_USER_BUF;
    });
}

template <typename Called>
ViStatus query(const Called &call, ViSession vi, ViConstString output, ViConstString input, Arguments &arguments)
{
    return call.onInstrument(
        vi, [&](InstrumentSession &session) { return session.formatted().query(output, input, arguments); });
}

} // namespace

ViStatus viPrintf(ViSession vi, ViConstString writeFmt, ...)
{
    va_list list;
    va_start(list, writeFmt);
    Arguments arguments(list);
    va_end(list);
    return print(Call("viPrintf", vi, writeFmt), vi, writeFmt, arguments);
}

ViStatus viVPrintf(ViSession vi, ViConstString writeFmt, ViVAList params)
{
    Arguments arguments(params);
    return print(Call("viVPrintf", vi, writeFmt), vi, writeFmt, arguments);
}

ViStatus viSPrintf(ViSession vi, ViPBuf buf, ViConstString writeFmt, ...)
{
    va_list list;
    va_start(list, writeFmt);
    Arguments arguments(list);
    va_end(list);
    return printToText(Call("viSPrintf", vi, Address{buf}, writeFmt), vi, buf, writeFmt, arguments);
}

ViStatus viVSPrintf(ViSession vi, ViPBuf buf, ViConstString writeFmt, ViVAList parms)
{
    Arguments arguments(parms);
    return printToText(Call("viVSPrintf", vi, Address{buf}, writeFmt), vi, buf, writeFmt, arguments);
}

ViStatus viScanf(ViSession vi, ViConstString readFmt, ...)
{
    va_list list;
    va_start(list, readFmt);
    Arguments arguments(list);
    va_end(list);
    return scan(Call("viScanf", vi, readFmt), vi, readFmt, arguments);
}

ViStatus viVScanf(ViSession vi, ViConstString readFmt, ViVAList params)
{
    Arguments arguments(params);
    return scan(Call("viVScanf", vi, readFmt), vi, readFmt, arguments);
}

ViStatus viSScanf(ViSession vi, ViConstBuf buf, ViConstString readFmt, ...)
{
    va_list list;
    va_start(list, readFmt);
    Arguments arguments(list);
    va_end(list);
    return scanText(Call("viSScanf", vi, reinterpret_cast<const char *>(buf), readFmt), vi, buf, readFmt, arguments);
}

ViStatus viVSScanf(ViSession vi, ViConstBuf buf, ViConstString readFmt, ViVAList parms)
{
    Arguments arguments(parms);
    return scanText(Call("viVSScanf", vi, reinterpret_cast<const char *>(buf), readFmt), vi, buf, readFmt, arguments);
}

ViStatus viQueryf(ViSession vi, ViConstString writeFmt, ViConstString readFmt, ...)
{
    va_list list;
    va_start(list, readFmt);
    Arguments arguments(list);
    va_end(list);
    return query(Call("viQueryf", vi, writeFmt, readFmt), vi, writeFmt, readFmt, arguments);
}

ViStatus viVQueryf(ViSession vi, ViConstString writeFmt, ViConstString readFmt, ViVAList params)
{
    Arguments arguments(params);
    return query(Call("viVQueryf", vi, writeFmt, readFmt), vi, writeFmt, readFmt, arguments);
}

ViStatus viSetBuf(ViSession vi, ViUInt16 mask, ViUInt32 size)
{
    return Call("viSetBuf", vi, mask, size).onInstrument(vi, [&](InstrumentSession &session) {
        return session.formatted().setBuffer(mask, size);
    });
}

ViStatus viFlush(ViSession vi, ViUInt16 mask)
{
    return Call("viFlush", vi, mask).onInstrument(vi, [&](InstrumentSession &session) {
        return session.formatted().flush(mask);
    });
}

ViStatus viBufWrite(ViSession vi, ViConstBuf buf, ViUInt32 cnt, ViPUInt32 retCnt)
{
    storeIfWanted<ViUInt32>(retCnt, 0);
    return Call("viBufWrite", vi, Bytes{buf, cnt}, cnt, Out{retCnt})
        .onInstrument(vi, [&](InstrumentSession &session) -> ViStatus {
            if (!buf && cnt > 0)
                return VI_ERROR_USER_BUF;
            std::size_t count = 0;
            const ViStatus status = session.formatted().write(std::as_bytes(std::span(buf, cnt)), count);
            storeIfWanted(retCnt, static_cast<ViUInt32>(count));
            return status;
        });
}

ViStatus viBufRead(ViSession vi, ViPBuf buf, ViUInt32 cnt, ViPUInt32 retCnt)
{
    storeIfWanted<ViUInt32>(retCnt, 0);
    return Call("viBufRead", vi, Received{buf, retCnt}, cnt, Out{retCnt})
        .onInstrument(vi, [&](InstrumentSession &session) -> ViStatus {
            if (!buf && cnt > 0)
                return VI_ERROR_USER_BUF;
            std::size_t count = 0;
            const ViStatus status = session.formatted().read(std::as_writable_bytes(std::span(buf, cnt)), count);
            storeIfWanted(retCnt, static_cast<ViUInt32>(count));
            return status;
        });
}
