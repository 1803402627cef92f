#include "kyvisa/api/Call.h"
#include "kyvisa/core/FileTransfer.h"

#include <span>

using namespace kyvisa;
using namespace kyvisa::api;

namespace
{

std::span<std::byte> bytes(ViPBuf buf, ViUInt32 cnt)
{
    return std::as_writable_bytes(std::span(buf, cnt));
}

std::span<const std::byte> bytes(ViConstBuf buf, ViUInt32 cnt)
{
    return std::as_bytes(std::span(buf, cnt));
}

} // namespace

ViStatus viRead(ViSession vi, ViPBuf buf, ViUInt32 cnt, ViPUInt32 retCnt)
{
    storeIfWanted<ViUInt32>(retCnt, 0);
    return Call("viRead", vi, Received{buf, retCnt}, cnt, Out{retCnt})
        .onInstrument(vi, [&](InstrumentSession &session) -> ViStatus {
            if (!buf && cnt > 0)
                return VI_ERROR_USER_BUF;
            std::size_t count = 0;
            const ViStatus status = session.read(bytes(buf, cnt), count);
            storeIfWanted(retCnt, static_cast<ViUInt32>(count));
            return status;
        });
}

ViStatus viReadAsync(ViSession vi, ViPBuf buf, ViUInt32 cnt, ViPJobId jobId)
{
    storeIfWanted<ViJobId>(jobId, VI_NULL);
    return Call("viReadAsync", vi, Address{buf}, cnt, Out{jobId})
        .onInstrument(vi, [&](InstrumentSession &session) -> ViStatus {
            if (!buf && cnt > 0)
                return VI_ERROR_USER_BUF;
            return session.readAsync(bytes(buf, cnt), jobId);
        });
}

ViStatus viReadToFile(ViSession vi, ViConstString filename, ViUInt32 cnt, ViPUInt32 retCnt)
{
    storeIfWanted<ViUInt32>(retCnt, 0);
    return Call("viReadToFile", vi, filename, cnt, Out{retCnt})
        .onInstrument(vi, [&](InstrumentSession &session) -> ViStatus {
            if (!filename)
                return VI_ERROR_FILE_ACCESS;
            ViUInt32 count = 0;
            const ViStatus status = readToFile(session, filename, cnt, count);
            storeIfWanted(retCnt, count);
            return status;
        });
}

ViStatus viWrite(ViSession vi, ViConstBuf buf, ViUInt32 cnt, ViPUInt32 retCnt)
{
    storeIfWanted<ViUInt32>(retCnt, 0);
    return Call("viWrite", vi, Bytes{buf, cnt}, cnt, Out{retCnt})
        .onInstrument(vi, [&](InstrumentSession &session) -> ViStatus {
            if (!buf && cnt > 0)
                return VI_ERROR_USER_BUF;
            std::size_t count = 0;
            const ViStatus status = session.write(bytes(buf, cnt), count);
            storeIfWanted(retCnt, static_cast<ViUInt32>(count));
            return status;
        });
}

ViStatus viWriteAsync(ViSession vi, ViConstBuf buf, ViUInt32 cnt, ViPJobId jobId)
{
    storeIfWanted<ViJobId>(jobId, VI_NULL);
    return Call("viWriteAsync", vi, Bytes{buf, cnt}, cnt, Out{jobId})
        .onInstrument(vi, [&](InstrumentSession &session) -> ViStatus {
            if (!buf && cnt > 0)
                return VI_ERROR_USER_BUF;
            return session.writeAsync(bytes(buf, cnt), jobId);
        });
}

ViStatus viWriteFromFile(ViSession vi, ViConstString filename, ViUInt32 cnt, ViPUInt32 retCnt)
{
    storeIfWanted<ViUInt32>(retCnt, 0);
    return Call("viWriteFromFile", vi, filename, cnt, Out{retCnt})
        .onInstrument(vi, [&](InstrumentSession &session) -> ViStatus {
            if (!filename)
                return VI_ERROR_FILE_ACCESS;
            ViUInt32 count = 0;
            const ViStatus status = writeFromFile(session, filename, cnt, count);
            storeIfWanted(retCnt, count);
            return status;
        });
}

ViStatus viAssertTrigger(ViSession vi, ViUInt16 protocol)
{
    return Call("viAssertTrigger", vi, protocol).onInstrument(vi, [&](InstrumentSession &session) {
        return session.assertTrigger(protocol);
    });
}

ViStatus viReadSTB(ViSession vi, ViPUInt16 status)
{
    storeIfWanted<ViUInt16>(status, 0);
    return Call("viReadSTB", vi, Out{status}).onInstrument(vi, [&](InstrumentSession &session) -> ViStatus {
        // A serial poll takes the request for service away: not for nobody.
        if (!status)
            return VI_ERROR_INV_PARAMETER;
        ViUInt16 byte = 0;
        const ViStatus result = session.readStatusByte(byte);
        *status = byte;
        return result;
    });
}

ViStatus viClear(ViSession vi)
{
    return Call("viClear", vi).onInstrument(vi, [](InstrumentSession &session) { return session.clear(); });
}
