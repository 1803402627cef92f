#include "pipeline/VisaSessionWorker.h"

#include "pipeline/ReceivedText.h"
#include "pipeline/VisaError.h"
#include "pipeline/VisaFunctionCallHandler.h"
#include "visa/Attribute.h"
#include "visa/CallBackLog.h"

#include <QScopeGuard>

#include <cstdio>
#include <cstdlib>
#include <utility>

namespace
{
constexpr unsigned WaitOnEventTimeout = 2000; // ms, whatever the panel asks for
constexpr std::size_t NameSize = 1024;        // VISA promises names and keys of at most 256 bytes

unsigned int number(const Parameter &parameter)
{
    return static_cast<unsigned int>(parameter.uintValue);
}

/// An argument of a 16-bit VISA parameter.
unsigned short shortNumber(const Parameter &parameter)
{
    return static_cast<unsigned short>(parameter.uintValue);
}

unsigned int length(const Parameter &parameter)
{
    return static_cast<unsigned int>(parameter.stringValue.size());
}
} // namespace

VisaSessionWorker::VisaSessionWorker(VisaFunctionCallHandler *handler)
    : m_logFile(nullptr), m_log(&m_logFile), m_sessionLog(&m_log, nullptr), m_testLog(&m_log, nullptr),
      m_session(&m_sessionLog), m_testThreads{{&m_testLog, this}, {&m_testLog, this}}, m_handler(handler),
      m_callBackLog(CallBackLog::createCallBackLog(&m_sessionLog))
{
    m_testThreads[0].setid(0);
    m_testThreads[1].setid(1);
    m_fileLogRuns = pthread_create(&m_fileLogThread, nullptr, ThreadForFileLog, &m_log) == 0;
}

VisaSessionWorker::~VisaSessionWorker()
{
    m_closing.store(true);
    m_testThreads[0].stop();
    m_testThreads[1].stop();
    // Stopped here as well as by doWork(), which may never have run. From now on nobody blocks on the file queue, so that
    // a callback that is writing comes to its end.
    m_log.stop();
    CallBackLog::forget(&m_sessionLog);
    if (m_fileLogRuns)
        pthread_join(m_fileLogThread, nullptr);
}

void VisaSessionWorker::doWork()
{
    for (;;) {
        _visaFunctionCall result;
        _visaFunctionCall request;
        if (!m_handler || !m_handler->getVisaFunctionCall(request)) {
            m_log.stop();
            return;
        }
        result.type = request.type;
        if (request.type == VisaFunctionCallTyp::StopTest) {
            // The only result of this kind is that of the test, when it has ended.
            testThread(request.parameter[0]).stop();
            continue;
        }
        execute(request, result);
        m_handler->VisaFunctionCallFinshed(result);
    }
}

void VisaSessionWorker::testFinished(unsigned int result, unsigned int id)
{
    if (m_closing.load() || !m_handler)
        return;
    _visaFunctionCall finished;
    finished.type = VisaFunctionCallTyp::StopTest;
    finished.parameter[0].uintValue = id;
    finished.parameter[1].uintValue = result;
    m_handler->VisaFunctionCallFinshed(finished);
}

void VisaSessionWorker::openRM()
{
    m_testThreads[0].openRM();
    m_testThreads[1].openRM();
    m_session.openRM();
}

void VisaSessionWorker::closeRM()
{
    m_testThreads[0].closeRM();
    m_testThreads[1].closeRM();
    m_session.closeRM();
    m_findList = 0; // went with its resource manager
    m_findCount = 0;
}

void VisaSessionWorker::execute(_visaFunctionCall &request, _visaFunctionCall &result)
{
    try {
        dispatch(request, result);
    } catch (const VisaError &error) {
        result.status = error.getStatus();
    } catch (...) {
        FastBuffer line;
        std::snprintf(line.text, sizeof line.text, "Execption occur");
        line.status = 0;
        line.duration = 0;
        m_sessionLog.forceEmitWriteMessage(&line);
    }
}

void VisaSessionWorker::dispatch(_visaFunctionCall &request, _visaFunctionCall &result)
{
    auto &[first, second, third] = request.parameter;
    switch (request.type) {
    case VisaFunctionCallTyp::FindRsrc:
        return findRsrc(request, result);
    case VisaFunctionCallTyp::FindNext:
        return findNext(result);
    case VisaFunctionCallTyp::Open:
        return m_session.open(first.stringValue.data(), number(second), number(third));
    case VisaFunctionCallTyp::Close:
        return m_session.closeSession();
    case VisaFunctionCallTyp::SetAttribute:
        return setAttribute(request, result, true);
    case VisaFunctionCallTyp::SetAttributeDef:
        return setAttribute(request, result, false);
    case VisaFunctionCallTyp::GetAttribute:
        return getAttribute(request, result, true);
    case VisaFunctionCallTyp::GetAttributeDef:
        return getAttribute(request, result, false);
    case VisaFunctionCallTyp::ExclusiveLock:
        return m_session.lockExclusive(number(first));
    case VisaFunctionCallTyp::SharedLock:
        return lockShared(request, result);
    case VisaFunctionCallTyp::Unlock:
        return m_session.unlock();
    case VisaFunctionCallTyp::EnableEvent:
        return m_session.enableEvent(number(first), shortNumber(second), 0);
    case VisaFunctionCallTyp::DisableEvent:
        return m_session.disableEvent(number(first), shortNumber(second));
    case VisaFunctionCallTyp::DiscardEvents:
        return m_session.discardEvents(number(first), shortNumber(second));
    case VisaFunctionCallTyp::WaitOnEvent:
        m_session.waitOnEvent(number(first), WaitOnEventTimeout, nullptr);
        return;
    case VisaFunctionCallTyp::InstallHandler:
        return m_session.installHandler(number(first), CallBackLog::viEventHandler, nullptr);
    case VisaFunctionCallTyp::UninstallHandler:
        return m_session.uninstallHandler(number(first), CallBackLog::viEventHandler, nullptr);
    case VisaFunctionCallTyp::Read:
        return receiveText(first.uintValue, result.parameter[0].stringValue,
                           [this](char *buffer, ViUInt32 size) { return m_session.read(buffer, size); });
    case VisaFunctionCallTyp::Write:
        m_session.write(first.stringValue.data(), length(first));
        return;
    case VisaFunctionCallTyp::Query:
        return receiveText(second.uintValue, result.parameter[0].stringValue,
                           [this, &command = first](char *buffer, ViUInt32 size) {
                               return m_session.query(command.stringValue.data(), length(command), buffer, size);
                           });
    case VisaFunctionCallTyp::AssertTrigger:
        return m_session.trigger(0);
    case VisaFunctionCallTyp::ReadSTB:
        result.parameter[0].uintValue = m_session.getSTB();
        return;
    case VisaFunctionCallTyp::Clear:
        return m_session.clear();
    case VisaFunctionCallTyp::GpibControlREN:
        return m_session.gpibControlREN(shortNumber(first));
    case VisaFunctionCallTyp::GpibControlATN:
        return m_session.gpibConrtolATN(shortNumber(first));
    case VisaFunctionCallTyp::GpibSendIFC:
        return m_session.gpibSendIFC();
    case VisaFunctionCallTyp::GpibCommand:
        m_session.gpibCommand(first.stringValue.data(), length(first));
        return;
    case VisaFunctionCallTyp::GpibPassControl:
        return m_session.gpibPassControl(shortNumber(first), shortNumber(second));
    case VisaFunctionCallTyp::Test:
        return testThread(third).startTest(first.stringValue.c_str(), reinterpret_cast<TestFunction>(second.uintValue));
    default:
        return; // finished at once
    }
}

void VisaSessionWorker::findRsrc(_visaFunctionCall &request, _visaFunctionCall &result)
{
    // A search that was not followed to its end has left its list open.
    closeFindList();
    forgetFoundTexts();
    char name[NameSize] = "";
    m_findCount = m_session.findRsrc(request.parameter[0].stringValue.data(), &m_findList, name);
    if (m_findCount > 0)
        --m_findCount;
    fillFound(name, result);
}

void VisaSessionWorker::findNext(_visaFunctionCall &result)
{
    forgetFoundTexts();
    char name[NameSize] = "";
    m_session.findNext(m_findList, name);
    const bool last = m_findCount == 1;
    if (m_findCount > 0)
        --m_findCount;
    fillFound(name, result);
    if (last)
        m_session.closeObject(std::exchange(m_findList, 0));
}

void VisaSessionWorker::forgetFoundTexts()
{
    // A resource without such texts must not show those of the one before.
    m_session.lxiIdentification.clear();
    m_session.lxiDescription.clear();
    m_session.lxiHostName.clear();
}

void VisaSessionWorker::fillFound(const char *name, _visaFunctionCall &result)
{
    auto &[first, second, third] = result.parameter;
    first.stringValue = name;
    second.uintValue = m_findCount;
    second.stringValue = m_session.lxiIdentification.toStdString();
    third.uintValue = reinterpret_cast<std::uintptr_t>(&m_session);
    third.stringValue = m_session.lxiDescription.toStdString() + '\0' + m_session.lxiHostName.toStdString();
}

void VisaSessionWorker::closeFindList()
{
    if (m_findList == 0)
        return;
    try {
        m_session.closeObject(std::exchange(m_findList, 0));
    } catch (const VisaError &) { // it is in the log; the new search does not depend on it
    }
}

void VisaSessionWorker::setAttribute(const _visaFunctionCall &request, _visaFunctionCall &result, bool onSession)
{
    // Before the call: whoever hears that it failed has to know what was asked.
    result.parameter[0] = request.parameter[0];
    result.parameter[1] = request.parameter[1];
    m_session.setAttribute({.id = number(request.parameter[0]), .value = request.parameter[1].uintValue}, onSession);
}

void VisaSessionWorker::getAttribute(const _visaFunctionCall &request, _visaFunctionCall &result, bool onSession)
{
    Attribute attribute{.id = number(request.parameter[0])};
    result.parameter[0].uintValue = attribute.id;
    const auto release = qScopeGuard([&attribute] {
        if (attribute.isText())
            std::free(reinterpret_cast<void *>(attribute.value));
    });
    m_session.getAttribute(attribute, onSession);
    if (attribute.isText())
        result.parameter[1].stringValue = attribute.text();
    else
        result.parameter[1].uintValue = attribute.value;
}

void VisaSessionWorker::lockShared(_visaFunctionCall &request, _visaFunctionCall &result)
{
    char accessKey[NameSize] = "";
    try {
        m_session.lockShared(number(request.parameter[0]), request.parameter[1].stringValue.data(), accessKey);
    } catch (const VisaError &error) {
        // A completion code, such as that of a nested lock, grants the lock all the same.
        if (error.getStatus() >= 0)
            result.parameter[0].stringValue = accessKey;
        throw;
    }
    result.parameter[0].stringValue = accessKey;
}
