#include "instrtests/StressMmemTest.h"

#include "instrtests/Answer.h"
#include "instrtests/BlockReader.h"
#include "instrtests/InterfaceSetup.h"
#include "instrtests/RandomNumbers.h"
#include "instrtests/TestLine.h"
#include "pipeline/VisaError.h"
#include "visa/VisaSessionWithLog.h"

#include <visa.h>

#include <QElapsedTimer>

#include <algorithm>
#include <charconv>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

namespace
{

constexpr std::size_t WriteBufferSize = 31457280;
constexpr std::size_t ReadBufferSize = 31461376;
constexpr unsigned UsualUnits = 30720; // of 1024 bytes
constexpr unsigned SerialUnits = 15;
constexpr unsigned Timeout = 30000; // ms
constexpr unsigned MessageAvailableBit = 16;
constexpr std::chrono::milliseconds MessageAvailablePause{200};
constexpr int MessageAvailableTimeout = 20000; // ms
constexpr int QueryInterrupted = -410;
constexpr long long NoNumber = -1;               // a length that the instrument did not spell as one
constexpr unsigned SerialBytesPerSecond = 11520; // 115200 baud, ten bits a byte
constexpr qint64 SerialMarginMs = 200;           // for what flow control and the instrument take
constexpr std::chrono::milliseconds SerialPause{10};
constexpr std::size_t FillStep = 65536; // bytes between two looks at the stop flag

/// Bytes and the time that they took.
struct Total {
    unsigned long long bytes = 0;
    double seconds = 0;

    void add(std::size_t count, qint64 nanoseconds)
    {
        bytes += count;
        seconds += static_cast<double>(nanoseconds) / 1e9;
    }
    /// Millions of bits a second.
    double rate() const { return static_cast<double>(bytes) * 8 / 1000000 / seconds; }
};

class StressMmemTest
{
public:
    StressMmemTest(SessionLog *log, VisaSessionWithLog &session, const std::atomic<bool> &stop)
        : m_log(log), m_session(session), m_stop(stop), m_written(WriteBufferSize), m_read(ReadBufferSize)
    {
    }

    /// Throws VisaError.
    void setUp();
    /// Throws VisaError.
    void runUntilStopped();
    void logResult() const;
    unsigned status() const { return m_status; }

private:
    void setUpInterface();
    void identify();
    void selectMassMemory();
    void act(unsigned number);
    void clear();
    bool lastBlockHasLeft() const;
    void readStatusByteByQuery();
    void writeBlock();
    bool fill(std::size_t length);
    void readBlock();
    void awaitMessageAvailable();
    bool readHeader();
    long long readLength(unsigned digits);
    void compare(std::size_t count);
    bool stopped() const { return m_stop.load(std::memory_order_relaxed); }
    void drainErrors();
    unsigned query(const char *command);
    void fail()
    {
        m_status = 1;
        m_ended = true;
    }

    SessionLog *m_log;
    VisaSessionWithLog &m_session;
    const std::atomic<bool> &m_stop;
    std::vector<char> m_written; ///< data of the last block written
    std::vector<char> m_read;
    std::string m_command; ///< the last block with what stands around it
    unsigned m_units = UsualUnits;
    BlockEnd m_blockEnd = BlockEnd::Message;
    bool m_gpib = false;
    bool m_serviceRequests = true;
    bool m_otherModel = true;
    std::size_t m_lastLength = 0; ///< of the last block written; 0 when there is none
    bool m_blockTaken = true;     ///< the instrument has answered since the last block
    int m_clears = 0;
    int m_triggers = 0;
    Total m_readTotal;
    Total m_writeTotal;
    unsigned m_status = 0;
    bool m_ended = false;
    Answer m_answer;
    QElapsedTimer m_timer;
    QElapsedTimer m_sinceBlock; ///< runs since the last block began to leave
};

void StressMmemTest::setUp()
{
    m_timer.start();
    setUpInterface();
    identify();
    if (query("*OPC?\n") > 2) {
        logTestLine(m_log, "Invalid response for *OPC?: %.50s", m_answer.printable().c_str());
        m_status = 1; // and the test goes on
    }
    if (m_gpib)
        m_session.setAttribute(VI_ATTR_GPIB_UNADDR_EN, VI_TRUE, true);
    if (m_serviceRequests)
        m_session.enableEvent(VI_EVENT_SERVICE_REQ, VI_QUEUE, 0);
    logTestLine(m_log, "Press 'Stop Test' to finish test!");
    std::fill(m_read.begin(), m_read.end(), '\0');
    selectMassMemory();
    query("system:error?\n");
    logTestLine(m_log, "%.30s", m_answer.printable().c_str());
    m_session.setTimeout(Timeout);
}

void StressMmemTest::setUpInterface()
{
    const auto interface = interfacesetup::number(m_session, VI_ATTR_INTF_TYPE);
    m_gpib = interface == VI_INTF_GPIB;
    if (interface == VI_INTF_ASRL) {
        interfacesetup::forceSerialSettings(m_session, VI_ASRL_FLOW_RTS_CTS);
        logTestLine(m_log, "Force ASRL settings to 115200,8,N,1,RTS/CTS. Max data size = 15 kB!");
        m_units = SerialUnits;
        m_blockEnd = BlockEnd::SerialTerminationChar;
        m_serviceRequests = false;
    }
    if (interfacesetup::isRawSocket(m_session)) {
        m_session.setAttribute(VI_ATTR_TERMCHAR_EN, VI_TRUE, true);
        m_blockEnd = BlockEnd::TerminationChar;
        m_serviceRequests = false;
    }
    m_session.setAttribute(VI_ATTR_IO_PROT, VI_PROT_4882_STRS, true);
}

void StressMmemTest::identify()
{
    m_session.clear();
    m_session.write("*CLS;*ESE 0;*SRE 0\n");
    query("*IDN?\n");
    logTestLine(m_log, "StressMmemTest of Device: %.50s", m_answer.printable().c_str());
    const std::string_view identification = m_answer.text();
    m_otherModel =
        identification.find(",ZAW") == identification.npos && identification.find("ZEB") == identification.npos;
}

void StressMmemTest::selectMassMemory()
{
    query(":mmem:msis?\n");
    logTestLine(m_log, "MSIS =%.30s", m_answer.printable().c_str());
    if (std::strstr(m_answer.text(), "D:") != nullptr) {
        m_session.write(":mmem:msis 'C:'");
        logTestLine(m_log, "MSIS set to C:");
    }
    if (m_otherModel) {
        query(":mmem:cdir?\n");
        logTestLine(m_log, "OTH:CDIR= %.30s", m_answer.printable().c_str());
    } else {
        query(":mmem:dir?\n");
        logTestLine(m_log, "ZAW:DIR = %.30s", m_answer.printable().c_str());
    }
}

void StressMmemTest::runUntilStopped()
{
    while (!m_ended && !stopped())
        act(randomnumbers::below(10));
}

void StressMmemTest::act(unsigned number)
{
    switch (number) {
    case 0:
        clear();
        break;
    case 1:
        if (m_gpib) {
            m_session.trigger(VI_TRIG_PROT_DEFAULT);
            ++m_triggers;
        }
        break;
    case 2:
        m_session.write("*OPC\n");
        break;
    case 3:
        readStatusByteByQuery();
        break;
    case 4:
        if (m_gpib)
            interfacesetup::toggle(m_session, VI_ATTR_GPIB_UNADDR_EN);
        break;
    case 5:
        if (m_gpib)
            interfacesetup::toggle(m_session, VI_ATTR_GPIB_READDR_EN);
        break;
    case 6:
    case 7:
        writeBlock();
        break;
    default:
        if (m_lastLength > 0)
            readBlock();
        break;
    }
}

void StressMmemTest::clear()
{
    // A clear discards what the port has not sent yet: half a block would leave the instrument waiting for the rest.
    while (!lastBlockHasLeft()) {
        if (stopped())
            return;
        std::this_thread::sleep_for(SerialPause);
    }
    m_session.clear();
    ++m_clears;
    // Where a clear has a way of its own it overtakes a block that the instrument has not looked at, and discards it.
    if (m_blockEnd == BlockEnd::Message && !m_blockTaken)
        m_lastLength = 0;
}

bool StressMmemTest::lastBlockHasLeft() const
{
    if (m_blockEnd != BlockEnd::SerialTerminationChar || m_lastLength == 0)
        return true;
    return m_sinceBlock.elapsed() >
           static_cast<qint64>(m_command.size() * 1000 / SerialBytesPerSecond) + SerialMarginMs;
}

void StressMmemTest::readStatusByteByQuery()
{
    if (query("*STB?\n") > 0)
        return;
    logTestLine(m_log, "Warning! STB answer size is 0. Try again!");
    if (m_answer.read(m_session) == 0)
        logTestLine(m_log, "STB answer size is still zero!");
}

void StressMmemTest::writeBlock()
{
    std::size_t length = 0;
    if (randomnumbers::odd()) {
        length = randomnumbers::below(10) + 1;
    } else {
        const std::size_t units = randomnumbers::below(m_units) + 1;
        length = units * 1024 - randomnumbers::below(1023);
    }
    if (!fill(length))
        return;
    m_command = ":MMEM:DATA 'Test.dat',#" + std::to_string(std::to_string(length).size()) + std::to_string(length);
    m_command.append(m_written.data(), length);
    if (!m_serviceRequests || randomnumbers::odd())
        m_command += '\n';
    m_sinceBlock.start();
    m_timer.restart();
    m_session.write(m_command.data(), static_cast<unsigned>(m_command.size()));
    m_writeTotal.add(length, m_timer.nsecsElapsed());
    m_lastLength = length;
    m_blockTaken = false;
}

/// False when the test was stopped meanwhile: millions of random numbers take their time.
bool StressMmemTest::fill(std::size_t length)
{
    for (std::size_t begin = 0; begin < length; begin += FillStep) {
        if (stopped())
            return false;
        const std::size_t end = std::min(length, begin + FillStep);
        for (std::size_t i = begin; i < end; ++i)
            m_written[i] = static_cast<char>(randomnumbers::below(100));
    }
    return true;
}

void StressMmemTest::readBlock()
{
    // Before the answer is asked for, which the look into the queue would interrupt. What went wrong with the block
    // stands in the log then, before the difference that it makes.
    if (m_serviceRequests && randomnumbers::odd())
        drainErrors();
    m_session.write(":MMEM:DATA? 'Test.dat'\n");
    if (m_serviceRequests && randomnumbers::odd())
        awaitMessageAvailable();
    if (!readHeader())
        return fail();

    std::fill(m_read.begin(), m_read.end(), '\0');
    BlockReader reader(m_session, m_blockEnd);
    m_timer.restart();
    std::size_t count = reader.readData(m_read, m_lastLength);
    m_readTotal.add(count, m_timer.nsecsElapsed());
    if (count == m_lastLength)
        count += reader.readLineEnd();
    m_blockTaken = true;
    compare(count);
}

void StressMmemTest::awaitMessageAvailable()
{
    QElapsedTimer timer;
    timer.start();
    while ((m_session.getSTB() & MessageAvailableBit) == 0 && !stopped()) {
        if (timer.elapsed() > MessageAvailableTimeout) {
            logTestLine(m_log, "20 seconds no answer! Continue..");
            return;
        }
        std::this_thread::sleep_for(MessageAvailablePause);
    }
}

bool StressMmemTest::readHeader()
{
    if (m_answer.read(m_session, 2) < 2) {
        logTestLine(m_log, "Size of the answer is to short!");
        return false;
    }
    const char kind = m_answer.text()[0];
    const char digits = m_answer.text()[1];
    if (kind != '#') {
        logTestLine(m_log, "Answer doesn't begin with #");
        return false;
    }
    const long long length =
        digits >= '1' && digits <= '9' ? readLength(static_cast<unsigned>(digits - '0')) : NoNumber;
    if (length == static_cast<long long>(m_lastLength))
        return true;
    logTestLine(m_log, "Number of chars don't match: sent:  %lld received:  %lld ",
                static_cast<long long>(m_lastLength), length);
    return false;
}

long long StressMmemTest::readLength(unsigned digits)
{
    const unsigned count = m_answer.read(m_session, digits);
    const char *const begin = m_answer.text();
    unsigned length = 0;
    const auto [end, error] = std::from_chars(begin, begin + count, length);
    return count == digits && error == std::errc() && end == begin + count ? length : NoNumber;
}

void StressMmemTest::compare(std::size_t count)
{
    if (count != m_lastLength) {
        logTestLine(m_log, "Number of chars don't match: expected: %lld received:  %lld",
                    static_cast<long long>(m_lastLength), static_cast<long long>(count));
        return fail();
    }
    const auto end = m_written.begin() + static_cast<std::ptrdiff_t>(m_lastLength);
    const auto [sent, received] = std::mismatch(m_written.begin(), end, m_read.begin());
    if (sent == end)
        return;
    logTestLine(m_log, "Binary data not equal at index: %lld%c != %c", static_cast<long long>(sent - m_written.begin()),
                *sent, *received);
    fail();
}

void StressMmemTest::drainErrors()
{
    while (!stopped()) {
        query("syst:err?\n");
        int error = 0;
        if (std::sscanf(m_answer.text(), "%d", &error) != 1) {
            logTestLine(m_log, "Query: SYST:ERR? cannot parse %.30s", m_answer.printable().c_str());
            return;
        }
        if (error == 0)
            return;
        if (error != QueryInterrupted)
            logTestLine(m_log, "Query: SYST:ERR? returns: %.30s", m_answer.printable().c_str());
    }
}

unsigned StressMmemTest::query(const char *command)
{
    m_session.write(command);
    const unsigned count = m_answer.read(m_session);
    m_blockTaken = true;
    return count;
}

void StressMmemTest::logResult() const
{
    if (m_readTotal.bytes > 0 && m_writeTotal.bytes > 0)
        logTestLine(m_log, "Ready with %d Clear and %d Trigger. Average read %f MBits/s. Average write %f MBits/s",
                    m_clears, m_triggers, m_readTotal.rate(), m_writeTotal.rate());
    else
        logTestLine(m_log, "Test aborted. No data transferred.");
}

} // namespace

unsigned stressMmemTest(SessionLog *log, VisaSessionWithLog *session, const std::atomic<bool> *stop)
{
    StressMmemTest test(log, *session, *stop);
    unsigned status = 1;
    try {
        test.setUp();
        test.runUntilStopped();
        session->closeSession();
        status = test.status();
    } catch (const VisaError &error) {
        logTestLine(log, "Error: %.255s", VisaError::StatusCode(error.getStatus()));
        try {
            session->closeSession();
        } catch (const VisaError &) { // the first error is the one that is told
        }
    }
    test.logResult();
    return status;
}
