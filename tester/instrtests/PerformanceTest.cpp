#include "instrtests/PerformanceTest.h"

#include "instrtests/Answer.h"
#include "instrtests/InterfaceSetup.h"
#include "instrtests/ServiceRequest.h"
#include "instrtests/TestLine.h"
#include "pipeline/VisaError.h"
#include "visa/VisaSessionWithLog.h"

#include <visa.h>

#include <QElapsedTimer>

#include <cmath>
#include <cstdio>
#include <memory>

namespace
{

constexpr unsigned SerialBlockSize = 10000;
constexpr unsigned UsualBlockSize = 3000000;
constexpr unsigned CommandRoom = 200; // for what stands around the block
constexpr unsigned ShortRepetitions = 10;
constexpr unsigned LongRepetitions = 5;
constexpr unsigned ServiceRequestTimeout = 2000; // ms
constexpr unsigned TransferTimeout = 10000;      // ms
constexpr unsigned RequestServiceBit = 64;
constexpr unsigned RequestsUntilGivenUp = 6; // of status bytes in a row that ask for service
constexpr unsigned RequestsAllowed = 3;

class PerformanceTest
{
public:
    PerformanceTest(SessionLog *log, VisaSessionWithLog &session) : m_log(log), m_session(session) {}

    /// Every step, and the end. Throws VisaError.
    void run();

private:
    void setUpInterface();
    void setUpSerialInterface();
    void setUpRawSocket();
    void identify();
    void timeStatusByte();
    void timeQuery(const char *name, const char *command, const char *unit);
    void timeServiceRequests();
    bool timeServiceRequest();
    bool asksForServiceTooOften();
    bool hasMassMemory();
    void timeBlockWrite();
    void timeBlockRead();
    void query(const char *command);
    unsigned long long elapsed() const { return static_cast<unsigned long long>(m_timer.nsecsElapsed()); }
    void logTransfer(unsigned long long nanoseconds, unsigned bytes) const;

    SessionLog *m_log;
    VisaSessionWithLog &m_session;
    unsigned m_blockSize = UsualBlockSize;
    bool m_serviceRequests = true;
    Answer m_answer;
    std::unique_ptr<char[]> m_transfer; ///< the block with its command, written and read
    QElapsedTimer m_timer;
};

void PerformanceTest::run()
{
    setUpInterface();
    identify();
    timeStatusByte();
    timeQuery("*IDN?", "*IDN?\n", "us");
    // The micro sign here and "us" above are part of the log's vocabulary.
    timeQuery("*OPC?", "*OPC?\n", "µs");
    if (m_serviceRequests)
        timeServiceRequests();
    else
        logTestLine(m_log, "Test SRQs is skipped!");
    if (hasMassMemory()) {
        timeBlockWrite();
        timeBlockRead();
    } else {
        logTestLine(m_log, "Test MMEM:DATA[?] is skipped!");
    }
    logTestLine(m_log, "Test finished without Errors");
    m_session.closeSession();
    m_transfer.reset();
    try {
        m_session.closeSession();
    } catch (const VisaError &) { // closed already
    }
}

void PerformanceTest::setUpInterface()
{
    try {
        setUpSerialInterface();
        setUpRawSocket();
    } catch (const VisaError &) {
        // An interface that does not say what it is counts as none of the two.
        m_blockSize = UsualBlockSize;
        m_serviceRequests = true;
    }
    try {
        m_session.setAttribute(VI_ATTR_IO_PROT, VI_PROT_4882_STRS, true);
    } catch (const VisaError &) { // the status byte may be read all the same
    }
}

void PerformanceTest::setUpSerialInterface()
{
    if (!interfacesetup::isSerial(m_session))
        return;
    interfacesetup::forceSerialSettings(m_session, VI_ASRL_FLOW_RTS_CTS);
    logTestLine(m_log, "Force ASRL settings to 115200,8,N,1,RTS/CTS");
    m_blockSize = SerialBlockSize;
    m_serviceRequests = false;
}

void PerformanceTest::setUpRawSocket()
{
    try {
        if (!interfacesetup::isRawSocket(m_session))
            return;
        m_session.setAttribute(VI_ATTR_TERMCHAR_EN, VI_TRUE, true);
        m_serviceRequests = false;
    } catch (const VisaError &) { // what the serial settings found stays
    }
}

void PerformanceTest::identify()
{
    m_session.clear();
    query("*CLS;*IDN?\n");
    logTestLine(m_log, "Performance Test of Device: %.255s", m_answer.printable().c_str());
    m_answer.clear();
}

void PerformanceTest::timeStatusByte()
{
    logTestLine(m_log, "Test %d times viReadSTB", static_cast<int>(ShortRepetitions));
    m_timer.start();
    for (unsigned i = 0; i < ShortRepetitions; ++i)
        m_session.getSTB();
    logTestLine(m_log, "Ready with %llu us per call", elapsed() / 1000 / ShortRepetitions);
}

void PerformanceTest::timeQuery(const char *name, const char *command, const char *unit)
{
    logTestLine(m_log, "Test %u times %s", ShortRepetitions, name);
    m_timer.restart();
    for (unsigned i = 0; i < ShortRepetitions; ++i)
        query(command);
    logTestLine(m_log, "Ready with %llu %s per call", elapsed() / 1000 / ShortRepetitions, unit);
}

void PerformanceTest::timeServiceRequests()
{
    logTestLine(m_log, "Test SRQs");
    query("*ESE 1;*SRE 32;*OPC?\n");
    m_session.enableEvent(VI_EVENT_SERVICE_REQ, VI_QUEUE, 0);
    try {
        m_session.discardEvents(VI_EVENT_SERVICE_REQ, VI_QUEUE);
    } catch (const VisaError &) { // an empty queue answers with a completion code
    }
    for (unsigned i = 0; i < LongRepetitions; ++i) {
        if (!timeServiceRequest())
            break;
    }
    query("*ESE 0;*SRE 0;*OPC?\n");
}

bool PerformanceTest::timeServiceRequest()
{
    m_timer.restart();
    m_session.write("*OPC\n");
    ServiceRequest request(m_session);
    try {
        request.wait(ServiceRequestTimeout);
    } catch (const VisaError &) {
        logTestLine(m_log, "Error in waiting for SRQ");
        return false;
    }
    const unsigned long long nanoseconds = elapsed();
    request.close();
    logTestLine(m_log, "Ready with %llu µs", nanoseconds / 1000);
    if (asksForServiceTooOften()) {
        logTestLine(m_log, "Too much SRQs");
        return false;
    }
    query("*ESR?\n");
    return true;
}

bool PerformanceTest::asksForServiceTooOften()
{
    m_session.getSTB();
    unsigned requests = 0;
    while (requests < RequestsUntilGivenUp && (m_session.getSTB() & RequestServiceBit) != 0)
        ++requests;
    return requests > RequestsAllowed;
}

bool PerformanceTest::hasMassMemory()
{
    m_session.write("MMEM:CDIR 'C:\\'\n");
    m_session.write("*CLS\n");
    m_session.write(":MMEM:DATA 'Test.dat',#13ABC\n");
    query("*OPC?\n");
    int error = -1;
    char quote = '\0';
    m_session.viPrintf("system:error?\n");
    m_session.viScanf("%d,%c%*T", &error, &quote);
    return error == 0 && quote == '"';
}

void PerformanceTest::timeBlockWrite()
{
    m_session.setTimeout(TransferTimeout);
    logTestLine(m_log, "Test write %u Bytes", m_blockSize);
    const unsigned bufferSize = m_blockSize + CommandRoom;
    m_transfer = std::make_unique<char[]>(bufferSize);
    const int digits = static_cast<int>(std::log10(m_blockSize)) + 1;
    const int length = std::snprintf(m_transfer.get(), bufferSize, ":MMEM:DATA 'Test.dat',#%d%d%*s\n", digits,
                                     static_cast<int>(m_blockSize), static_cast<int>(m_blockSize), "TestString");
    for (unsigned i = 0; i < LongRepetitions; ++i) {
        m_timer.restart();
        m_session.write(m_transfer.get(), static_cast<unsigned>(length));
        logTransfer(elapsed(), static_cast<unsigned>(length));
    }
}

void PerformanceTest::timeBlockRead()
{
    logTestLine(m_log, "Test read %u Bytes", m_blockSize);
    for (unsigned i = 0; i < LongRepetitions; ++i) {
        m_timer.restart();
        m_session.write(":MMEM:DATA? 'Test.dat'\n");
        const unsigned count = m_session.read(m_transfer.get(), m_blockSize + CommandRoom);
        logTransfer(elapsed(), count);
    }
}

void PerformanceTest::query(const char *command)
{
    m_session.write(command);
    m_answer.read(m_session);
}

void PerformanceTest::logTransfer(unsigned long long nanoseconds, unsigned bytes) const
{
    // Bytes a second by 1048576, although the label says "Mb/s": see docs/decisions/performance-figures.md.
    logTestLine(m_log, "Duration %llu µs. %f Mb/s", nanoseconds / 1000,
                bytes / (static_cast<double>(nanoseconds) / 1e9 * 1024 * 1024));
}

} // namespace

unsigned performanceTest(SessionLog *log, VisaSessionWithLog *session, const std::atomic<bool> *)
{
    PerformanceTest test(log, *session);
    try {
        test.run();
        return 0;
    } catch (const VisaError &error) {
        logTestLine(log, "Error: %.255s", VisaError::StatusCode(error.getStatus()));
    }
    try {
        session->closeSession();
    } catch (const VisaError &) { // the first error is the one that is told
    }
    return 1;
}
