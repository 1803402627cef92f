#include "visa/VisaSessionWithLog.h"

#include "log/SessionLog.h"
#include "pipeline/VisaError.h"
#include "visa/KyVisaCodedString.h"
#include "visa/KyVisaNames.h"

#include <visa.h>

#include <QScopeGuard>

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

namespace
{

constexpr std::size_t TextAttributeSize = 512;

// Transfers and formatted I/O let completion codes and warnings pass: a read that ends on its count is no failure.
void throwIfNegative(ViStatus status)
{
    if (status < 0)
        throw VisaError(status);
}

// Everything else counts positive codes as failure too.
void throwUnlessZero(ViStatus status)
{
    if (status != 0)
        throw VisaError(status);
}

std::string coded(const char *text)
{
    return KyVisaCodedString(text, text != nullptr ? std::strlen(text) : 0);
}

/// What %s shows of a text that a caller may have left out.
const char *shown(const char *text)
{
    return text != nullptr ? text : "(null)";
}

/// An output text must not show what its buffer held before.
void emptyText(char *text)
{
    if (text != nullptr)
        text[0] = '\0';
}

unsigned long long addressOf(const void *pointer)
{
    return reinterpret_cast<std::uintptr_t>(pointer);
}

unsigned long long addressOf(ViHndlr handler)
{
    return reinterpret_cast<std::uintptr_t>(handler);
}

} // namespace

VisaSessionWithLog::VisaSessionWithLog(SessionLog *log) : m_log(log)
{
    m_timer.start();
    openRM();
}

VisaSessionWithLog::~VisaSessionWithLog()
{
    // The session is closed here without a line, and a second time with one below: see
    // docs/decisions/double-close.md.
    if (m_session != 0)
        viClose(m_session);
    closeRM();
}

bool VisaSessionWithLog::isLogging() const
{
    return m_log != nullptr && m_log->isLogging();
}

template <typename Call>
ViStatus VisaSessionWithLog::timed(FastBuffer &line, Call call)
{
    m_timer.restart();
    line.status = call();
    line.duration = static_cast<std::uint64_t>(m_timer.nsecsElapsed());
    return line.status;
}

void VisaSessionWithLog::emitLine(FastBuffer &line, const char *format, ...)
{
    va_list arguments;
    va_start(arguments, format);
    std::vsnprintf(line.text, sizeof line.text, format, arguments);
    va_end(arguments);
    m_log->emitWriteMessage(&line);
}

ViObject VisaSessionWithLog::attributeHandle(bool onSession) const
{
    return onSession && m_session != 0 ? m_session : m_resourceManager;
}

ViStatus VisaSessionWithLog::openRM()
{
    m_resourceManager = 0;
    return viOpenDefaultRM(&m_resourceManager);
}

void VisaSessionWithLog::closeRM()
{
    try {
        closeSession();
    } catch (...) { // the resource manager is to be closed all the same
    }
    if (m_resourceManager != 0)
        viClose(m_resourceManager);
    m_resourceManager = 0;
}

void VisaSessionWithLog::open(char *rsrc, unsigned int mode, unsigned int timeout)
{
    if (m_session != 0)
        closeSession();
    FastBuffer line;
    const ViStatus status = timed(line, [&] { return viOpen(m_resourceManager, rsrc, mode, timeout, &m_session); });
    m_open = true;
    if (isLogging())
        emitLine(line, "viOpen(sesn= %d, rsrc= %s, mode= %d, timeout= %u, vi= %u)", static_cast<int>(m_resourceManager),
                 shown(rsrc), static_cast<int>(mode), timeout, m_session);
    throwUnlessZero(status);
}

void VisaSessionWithLog::closeSession()
{
    if (!m_open)
        return;
    FastBuffer line;
    const ViSession session = m_session;
    const ViStatus status = timed(line, [&] { return viClose(session); });
    m_session = 0;
    if (isLogging()) {
        m_open = false; // on this path alone: see docs/decisions/open-flag-follows-logging.md
        emitLine(line, "viClose(vi= %u)", session);
    }
    throwUnlessZero(status);
}

unsigned int VisaSessionWithLog::write(const char *buf, unsigned int cnt)
{
    FastBuffer line;
    ViUInt32 retCnt = 0;
    const ViStatus status =
        timed(line, [&] { return viWrite(m_session, reinterpret_cast<ViConstBuf>(buf), cnt, &retCnt); });
    retCnt = std::min(retCnt, cnt);
    if (isLogging())
        emitLine(line, "viWrite(vi= %u,buf= \"%s\",cnt= %u,retCnt= %u)", m_session, KyVisaCodedString(buf, cnt).c_str(),
                 cnt, retCnt);
    throwIfNegative(status);
    return retCnt;
}

unsigned int VisaSessionWithLog::write(const char *text)
{
    return write(text, text != nullptr ? static_cast<unsigned int>(std::strlen(text)) : 0);
}

unsigned int VisaSessionWithLog::read(char *buf, unsigned int cnt)
{
    FastBuffer line;
    ViUInt32 retCnt = 0;
    const ViStatus status = timed(line, [&] { return viRead(m_session, reinterpret_cast<ViPBuf>(buf), cnt, &retCnt); });
    retCnt = std::min(retCnt, cnt);
    if (isLogging())
        emitLine(line, "viRead(vi= %u,buf= \"%s\",cnt= %d,retCnt= %u)", m_session,
                 KyVisaCodedString(buf, retCnt).c_str(), static_cast<int>(cnt), retCnt);
    throwIfNegative(status);
    return retCnt;
}

unsigned int VisaSessionWithLog::query(const char *wbuf, unsigned int wcnt, char *rbuf, unsigned int rcnt)
{
    write(wbuf, wcnt);
    return read(rbuf, rcnt);
}

void VisaSessionWithLog::viPrintf(const char *fmt, ...)
{
    FastBuffer line;
    va_list arguments;
    va_start(arguments, fmt);
    const ViStatus status = timed(line, [&] { return viVPrintf(m_session, fmt, arguments); });
    va_end(arguments);
    if (isLogging())
        emitLine(line, "viPrintf(vi= %u,writeFmt=\"%s\")", m_session, coded(fmt).c_str());
    throwIfNegative(status);
}

void VisaSessionWithLog::viScanf(const char *fmt, ...)
{
    FastBuffer line;
    va_list arguments;
    va_start(arguments, fmt);
    const ViStatus status = timed(line, [&] { return viVScanf(m_session, fmt, arguments); });
    va_end(arguments);
    if (isLogging())
        emitLine(line, "viScanf(vi= %u,readFmt=\"%s\")", m_session, coded(fmt).c_str());
    throwIfNegative(status);
}

void VisaSessionWithLog::viQueryf(const char *writeFmt, const char *readFmt, ...)
{
    FastBuffer line;
    va_list arguments;
    va_start(arguments, readFmt);
    const ViStatus status = timed(line, [&] { return viVQueryf(m_session, writeFmt, readFmt, arguments); });
    va_end(arguments);
    // The first format has no closing quote: see docs/decisions/uneven-log-texts.md.
    if (isLogging())
        emitLine(line, "viQueryf(vi= %u,writeFmt=\"%s,readFmt=\"%s\")", m_session, coded(writeFmt).c_str(),
                 coded(readFmt).c_str());
    throwIfNegative(status);
}

void VisaSessionWithLog::setAttribute(unsigned int attr, unsigned long value, bool onSession)
{
    FastBuffer line;
    const ViObject handle = attributeHandle(onSession);
    const ViStatus status = timed(line, [&] { return viSetAttribute(handle, attr, value); });
    if (isLogging())
        emitLine(line, "viSetAttribute(vi= %u,type= %s,value= 0x%llX)", handle, KyVisaAttrToString(attr),
                 static_cast<unsigned long long>(value));
    throwUnlessZero(status);
}

void VisaSessionWithLog::setAttribute(const Attribute &attribute, bool onSession)
{
    setAttribute(attribute.id, attribute.value, onSession);
}

void VisaSessionWithLog::getAttribute(Attribute &attribute, bool onSession)
{
    FastBuffer line;
    const ViObject handle = attributeHandle(onSession);
    attribute.value = 0;
    ViStatus status = 0;
    if (attribute.isText()) {
        auto *text = static_cast<char *>(std::calloc(TextAttributeSize, 1));
        if (text == nullptr)
            throw std::bad_alloc();
        attribute.value = addressOf(text);
        status = timed(line, [&] { return viGetAttribute(handle, attribute.id, text); });
        text[TextAttributeSize - 1] = '\0';
        if (isLogging())
            emitLine(line, "viGetAttribute(vi= %u,type= %s,value= %s)", handle, KyVisaAttrToString(attribute.id), text);
    } else {
        status = timed(line, [&] { return viGetAttribute(handle, attribute.id, &attribute.value); });
        if (isLogging())
            emitLine(line, "viGetAttribute(vi= %u,type= %s,value= 0x%llX)", handle, KyVisaAttrToString(attribute.id),
                     static_cast<unsigned long long>(attribute.value));
    }
    throwUnlessZero(status);
}

void VisaSessionWithLog::setTimeout(unsigned int ms)
{
    FastBuffer line;
    const ViStatus status = timed(line, [&] { return viSetAttribute(m_session, VI_ATTR_TMO_VALUE, ms); });
    if (isLogging())
        emitLine(line, "viSetAttribute(vi= %u,type= %s,value= 0x%X)", m_session, KyVisaAttrToString(VI_ATTR_TMO_VALUE),
                 ms);
    throwUnlessZero(status);
}

unsigned short VisaSessionWithLog::getSTB()
{
    FastBuffer line;
    ViUInt16 stb = 0;
    const ViStatus status = timed(line, [&] { return viReadSTB(m_session, &stb); });
    if (isLogging())
        emitLine(line, "viReadSTB(vi= %u,stb= 0x%X)", m_session, static_cast<unsigned int>(stb));
    throwUnlessZero(status);
    return stb;
}

void VisaSessionWithLog::trigger(unsigned short protocol)
{
    FastBuffer line;
    const ViStatus status = timed(line, [&] { return viAssertTrigger(m_session, protocol); });
    if (isLogging())
        emitLine(line, "viAssertTrigger(vi= %u,proto= %hu)", m_session, protocol);
    throwUnlessZero(status);
}

void VisaSessionWithLog::clear()
{
    FastBuffer line;
    const ViStatus status = timed(line, [&] { return viClear(m_session); });
    if (isLogging())
        emitLine(line, "viClear(vi= %u)", m_session);
    throwUnlessZero(status);
}

void VisaSessionWithLog::lockExclusive(unsigned int timeout)
{
    FastBuffer line;
    const ViStatus status =
        timed(line, [&] { return viLock(m_session, VI_EXCLUSIVE_LOCK, timeout, nullptr, nullptr); });
    if (isLogging())
        emitLine(line, "viLock(vi= %u,mode= %s, timeout= %u, rKey= \"\", aKey= \"\")", m_session,
                 KyVisaLockToString(VI_EXCLUSIVE_LOCK), timeout);
    throwUnlessZero(status);
}

void VisaSessionWithLog::lockShared(unsigned int timeout, char *requestedKey, char *accessKey)
{
    FastBuffer line;
    if (accessKey != requestedKey)
        emptyText(accessKey);
    const ViStatus status =
        timed(line, [&] { return viLock(m_session, VI_SHARED_LOCK, timeout, requestedKey, accessKey); });
    if (isLogging())
        emitLine(line, "viLock(vi= %u,mode= %s, timeout= %u, rKey= %s, aKey= %s)", m_session,
                 KyVisaLockToString(VI_SHARED_LOCK), timeout, shown(requestedKey), shown(accessKey));
    throwUnlessZero(status);
}

void VisaSessionWithLog::unlock()
{
    FastBuffer line;
    const ViStatus status = timed(line, [&] { return viUnlock(m_session); });
    if (isLogging())
        emitLine(line, "viUnlock(vi= %u)", m_session);
    throwUnlessZero(status);
}

void VisaSessionWithLog::gpibControlREN(unsigned short mode)
{
    FastBuffer line;
    const ViStatus status = timed(line, [&] { return viGpibControlREN(m_session, mode); });
    if (isLogging())
        emitLine(line, "viGpibControlREN(vi= %u,mode= %s)", m_session, KyVisaRenModeToString(mode));
    throwUnlessZero(status);
}

void VisaSessionWithLog::gpibConrtolATN(unsigned short mode)
{
    FastBuffer line;
    const ViStatus status = timed(line, [&] { return viGpibControlATN(m_session, mode); });
    // With a small g: see docs/decisions/uneven-log-texts.md.
    if (isLogging())
        emitLine(line, "vigpibControlATN(vi= %u,mode= %s)", m_session, KyVisaAtnModeToString(mode));
    throwUnlessZero(status);
}

void VisaSessionWithLog::gpibSendIFC()
{
    FastBuffer line;
    const ViStatus status = timed(line, [&] { return viGpibSendIFC(m_session); });
    if (isLogging())
        emitLine(line, "viGpibSendIFC(vi= %u)", m_session);
    throwUnlessZero(status);
}

unsigned int VisaSessionWithLog::gpibCommand(char *buf, unsigned int cnt)
{
    FastBuffer line;
    ViUInt32 retCnt = 0;
    const ViStatus status =
        timed(line, [&] { return viGpibCommand(m_session, reinterpret_cast<ViConstBuf>(buf), cnt, &retCnt); });
    retCnt = std::min(retCnt, cnt);
    if (isLogging())
        emitLine(line, "viGpibCommand(vi= %u,buf=\"%s\",cnt=%u,retCnt=%u)", m_session,
                 KyVisaCodedString(buf, cnt).c_str(), cnt, retCnt);
    throwUnlessZero(status);
    return retCnt;
}

void VisaSessionWithLog::gpibPassControl(unsigned short primAddr, unsigned short secAddr)
{
    FastBuffer line;
    const ViStatus status = timed(line, [&] { return viGpibPassControl(m_session, primAddr, secAddr); });
    if (isLogging())
        emitLine(line, "viGpibPassControl(vi= %u,primAddr= 0x%hX, secAddr= 0x%hX)", m_session, primAddr, secAddr);
    throwUnlessZero(status);
}

void VisaSessionWithLog::enableEvent(unsigned int type, unsigned short mech, unsigned int context)
{
    FastBuffer line;
    const ViStatus status = timed(line, [&] { return viEnableEvent(m_session, type, mech, context); });
    if (isLogging())
        emitLine(line, "viEnableEvent(vi= %u,type= %s, mech= %hu, context= %u)", m_session, KyVisaEventToString(type),
                 mech, context);
    throwUnlessZero(status);
}

void VisaSessionWithLog::disableEvent(unsigned int type, unsigned short mech)
{
    FastBuffer line;
    const ViStatus status = timed(line, [&] { return viDisableEvent(m_session, type, mech); });
    if (isLogging())
        emitLine(line, "viDisableEvent(vi= %u,type= %s, mech= %hu)", m_session, KyVisaEventToString(type), mech);
    throwUnlessZero(status);
}

void VisaSessionWithLog::discardEvents(unsigned int type, unsigned short mech)
{
    FastBuffer line;
    const ViStatus status = timed(line, [&] { return viDiscardEvents(m_session, type, mech); });
    if (isLogging())
        emitLine(line, "viDiscardEvents(vi= %u,type= %s, mech= %hu)", m_session, KyVisaEventToString(type), mech);
    throwUnlessZero(status);
}

unsigned int VisaSessionWithLog::waitOnEvent(unsigned int inType, unsigned int timeout, unsigned int *outContext)
{
    FastBuffer line;
    ViEventType outType = 0;
    ViEvent context = 0;
    const ViStatus status = timed(line, [&] { return viWaitOnEvent(m_session, inType, timeout, &outType, &context); });
    if (isLogging())
        emitLine(line, "viWaitOnEvent(vi= %u, inType= %s, timeout= %u, outType=%s, outContext= %u)", m_session,
                 KyVisaEventToString(inType), timeout, KyVisaEventToString(outType), context);
    // A positive status is thrown below, yet the library has handed out a context that somebody must close.
    if (status >= 0 && outContext != nullptr)
        *outContext = context;
    else if (status >= 0 && context != 0)
        viClose(context);
    throwUnlessZero(status);
    return outType;
}

void VisaSessionWithLog::installHandler(unsigned int type, ViHndlr handler, void *userHandle)
{
    FastBuffer line;
    const ViStatus status = timed(line, [&] { return viInstallHandler(m_session, type, handler, userHandle); });
    if (isLogging())
        emitLine(line, "viInstallHandler(vi= %u, type= %s, hndlr= 0x%llX, uhndlr= 0x%llX)", m_session,
                 KyVisaEventToString(type), addressOf(handler), addressOf(userHandle));
    throwUnlessZero(status);
}

void VisaSessionWithLog::uninstallHandler(unsigned int type, ViHndlr handler, void *userHandle)
{
    FastBuffer line;
    const ViStatus status = timed(line, [&] { return viUninstallHandler(m_session, type, handler, userHandle); });
    if (isLogging())
        emitLine(line, "viUninstallHandler(vi= %u, type= %s, hndlr= 0x%llX, uhndlr= 0x%llX)", m_session,
                 KyVisaEventToString(type), addressOf(handler), addressOf(userHandle));
    throwUnlessZero(status);
}

unsigned int VisaSessionWithLog::findRsrc(char *expr, unsigned int *findList, char *instrDesc)
{
    FastBuffer line;
    ViUInt32 retCnt = 0;
    if (findList != nullptr)
        *findList = 0;
    emptyText(instrDesc);
    const ViStatus status =
        timed(line, [&] { return viFindRsrc(m_resourceManager, expr, findList, &retCnt, instrDesc); });
    const unsigned int list = findList != nullptr ? *findList : 0;
    if (isLogging())
        emitLine(line, "viFindRsrc(vi= %u, expr= %s, findList= %d, retcnt= %d, instrDesc= %s)", m_resourceManager,
                 shown(expr), static_cast<int>(list), static_cast<int>(retCnt), shown(instrDesc));
    throwUnlessZero(status);
    getExtendedRsrcInformation(list);
    return retCnt;
}

void VisaSessionWithLog::findNext(unsigned int findList, char *instrDesc)
{
    FastBuffer line;
    emptyText(instrDesc);
    const ViStatus status = timed(line, [&] { return viFindNext(findList, instrDesc); });
    if (isLogging())
        emitLine(line, "viFindNext(findList=%d, instrDesc= %s)", static_cast<int>(findList), shown(instrDesc));
    throwUnlessZero(status);
    getExtendedRsrcInformation(findList);
}

void VisaSessionWithLog::getExtendedRsrcInformation(unsigned int handle)
{
    // The find list stands in for the resource manager, so that getAttribute asks it.
    const auto restore = qScopeGuard([this, manager = m_resourceManager] { m_resourceManager = manager; });
    m_resourceManager = handle;
    const auto text = [this](ViAttr id) {
        Attribute attribute{.id = id};
        const auto release = qScopeGuard([&attribute] { std::free(reinterpret_cast<void *>(attribute.value)); });
        getAttribute(attribute, false);
        return QString::fromUtf8(attribute.text());
    };
    try {
        const QString manufacturer = text(VI_KY_ATTR_LXI_MANF);
        const QString model = text(VI_KY_ATTR_LXI_MODEL);
        const QString serial = text(VI_KY_ATTR_LXI_SERIAL);
        const QString version = text(VI_KY_ATTR_LXI_VERSION);
        lxiIdentification = manufacturer + "," + model + "," + serial + "," + version;
        lxiDescription = text(VI_KY_ATTR_LXI_DESCRIPTION);
        lxiHostName = text(VI_KY_ATTR_LXI_HOSTNAME);
        if (lxiHostName.endsWith('.'))
            lxiHostName.chop(1);
    } catch (const VisaError &) { // most resources have no such texts
    }
}

unsigned int VisaSessionWithLog::In32(unsigned short space, unsigned long offset)
{
    FastBuffer line;
    ViUInt32 val = 0;
    const ViStatus status = timed(line, [&] { return viIn32(m_session, space, offset, &val); });
    // The parenthesis stays open: see docs/decisions/uneven-log-texts.md.
    if (isLogging())
        emitLine(line, "viIn32(space=%d, offset= 0x%08X, val(%p)=0x%08X", space, static_cast<unsigned int>(offset),
                 static_cast<void *>(&val), val);
    throwUnlessZero(status);
    return val;
}

void VisaSessionWithLog::closeObject(unsigned int object)
{
    FastBuffer line;
    const ViStatus status = timed(line, [&] { return viClose(object); });
    if (isLogging())
        emitLine(line, "viClose(objectid= %u)", object);
    throwUnlessZero(status);
}
