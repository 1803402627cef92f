// A serial session down to termios and ioctl: every attribute by what the driver is told, errors by what the driver tells. The
// port is a recording fake behind the system calls.
#include "kyvisa/transport/SerialTransport.h"

#include "kyvisa/core/AttributeTable.h"
#include "kyvisa/core/InstrumentSession.h"
#include "kyvisa/core/Library.h"
#include "kyvisa/core/ResourceName.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/SerialPorts.h"
#include "kyvisa/os/SystemCalls.h"
#include "support/TemporaryFolder.h"

#include <array>
#include <asm/termios.h>
#include <cerrno>
#include <cstring>
#include <deque>
#include <filesystem>
#include <fstream>
#include <functional>
#include <gtest/gtest.h>
#include <linux/serial.h>
#include <map>

using namespace kyvisa;

namespace
{

/// What the fake driver was told, and what it answers.
struct Driver {
    termios2 line{};
    int modem = TIOCM_CTS | TIOCM_CD;
    bool hasModemLines = true;
    bool countsErrors = true;
    serial_icounter_struct counters{};
    int unsent = 0;
    bool moves = true; ///< what is unsent gets less
    int inTheChip = 0; ///< looks at the transmitter until that is empty too
    int breakError = 0;
    bool takesOutput = true;
    std::vector<std::string> log;
    std::string input;
    std::string output;
    std::function<void(termios2 &)> limits;
    int openError = 0;
    bool locked = false;
    bool terminal = true;
};

Driver *g_driver;

int fail(int error)
{
    errno = error;
    return -1;
}

int openPort(const char *path, int flags, mode_t)
{
    if (g_driver->openError != 0)
        return fail(g_driver->openError);
    g_driver->log.push_back(std::string("open ") + path + ((flags & O_NOCTTY) != 0 ? " noctty" : ""));
    return ::open("/dev/null", O_RDWR | O_CLOEXEC);
}

int lockPort(int, int)
{
    return g_driver->locked ? fail(EWOULDBLOCK) : 0;
}

int setModemLines(void *argument, bool on)
{
    if (!g_driver->hasModemLines)
        return fail(ENOTTY);
    const int bits = *static_cast<int *>(argument);
    g_driver->modem = on ? g_driver->modem | bits : g_driver->modem & ~bits;
    return 0;
}

int controlPort(int, unsigned long request, void *argument)
{
    Driver &driver = *g_driver;
    switch (request) {
    case TCGETS2:
        if (!driver.terminal)
            return fail(ENOTTY);
        std::memcpy(argument, &driver.line, sizeof driver.line);
        return 0;
    case TCSETS2:
        std::memcpy(&driver.line, argument, sizeof driver.line);
        if (driver.limits)
            driver.limits(driver.line);
        return 0;
    case TIOCMGET:
        if (!driver.hasModemLines)
            return fail(ENOTTY);
        *static_cast<int *>(argument) = driver.modem;
        return 0;
    case TIOCMBIS:
        return setModemLines(argument, true);
    case TIOCMBIC:
        return setModemLines(argument, false);
    case TIOCGICOUNT:
        if (!driver.countsErrors)
            return fail(ENOTTY);
        std::memcpy(argument, &driver.counters, sizeof driver.counters);
        return 0;
    case TIOCOUTQ:
        *static_cast<int *>(argument) = driver.unsent;
        driver.log.push_back("outq " + std::to_string(driver.unsent));
        if (driver.moves)
            driver.unsent = std::max(0, driver.unsent - 1);
        return 0;
    case TIOCSERGETLSR:
        *static_cast<int *>(argument) = driver.inTheChip > 0 ? 0 : TIOCSER_TEMT;
        driver.inTheChip = std::max(0, driver.inTheChip - 1);
        return 0;
    case TIOCINQ:
        *static_cast<int *>(argument) = static_cast<int>(driver.input.size());
        return 0;
    case TCFLSH:
        driver.log.push_back(reinterpret_cast<std::intptr_t>(argument) == TCIFLUSH ? "drop input" : "drop output");
        if (reinterpret_cast<std::intptr_t>(argument) == TCIFLUSH)
            driver.input.clear();
        return 0;
    case TIOCSBRK:
        if (driver.breakError != 0)
            return fail(driver.breakError);
        driver.log.push_back("break on");
        return 0;
    case TIOCCBRK:
        driver.log.push_back("break off");
        return 0;
    case TIOCEXCL:
        driver.log.push_back("exclusive");
        return 0;
    default:
        return 0;
    }
}

ssize_t readPort(int, void *buffer, size_t size)
{
    if (g_driver->input.empty())
        return fail(EAGAIN);
    // termios(3): PARMRK is meaningful only when INPCK is set
    const std::string mark("\xFF\0", 2);
    for (std::size_t at = 0;
         (g_driver->line.c_iflag & INPCK) == 0 && (at = g_driver->input.find(mark, at)) != std::string::npos;)
        g_driver->input.erase(at, mark.size());
    const std::size_t count = std::min(size, g_driver->input.size());
    std::memcpy(buffer, g_driver->input.data(), count);
    g_driver->input.erase(0, count);
    return static_cast<ssize_t>(count);
}

ssize_t writePort(int, const void *data, size_t size)
{
    if (!g_driver->takesOutput)
        return fail(EAGAIN);
    g_driver->output.append(static_cast<const char *>(data), size);
    g_driver->log.push_back("write");
    return static_cast<ssize_t>(size);
}

os::SystemCalls fakeCalls()
{
    os::SystemCalls calls = os::realSystemCalls();
    calls.open = openPort;
    calls.flock = lockPort;
    calls.ioctl = controlPort;
    calls.read = readPort;
    calls.write = writePort;
    return calls;
}

class Serial : public testing::Test
{
protected:
    Serial()
    {
        g_driver = &m_driver;
        m_driver.line.c_cflag = CLOCAL | CREAD | CS7 | PARENB;
        m_driver.line.c_lflag = ICANON | ECHO;
    }

    ViStatus connect()
    {
        ResourceName name;
        EXPECT_EQ(parseResourceName("ASRL/dev/ttyUSB7::INSTR", name), VI_SUCCESS);
        return SerialTransport::connect(name, m_transport);
    }
    os::WaitLimit within(int milliseconds) const
    {
        return {os::Deadline::after(std::chrono::milliseconds(milliseconds)), m_nobody};
    }
    ViStatus set(ViAttr attribute, std::int64_t value)
    {
        return m_transport->applyAttribute(attribute, static_cast<ViUInt64>(value), within(1000));
    }
    std::int16_t get(ViAttr attribute)
    {
        ViUInt64 value = 0;
        EXPECT_EQ(m_transport->readAttribute(attribute, within(1000), value), VI_SUCCESS);
        return static_cast<std::int16_t>(value);
    }
    ViStatus read(std::size_t size = 64)
    {
        m_text.assign(size, '\0');
        std::size_t count = 0;
        const ViStatus status = m_transport->read(std::as_writable_bytes(std::span(m_text)), m_mode, within(30), count);
        m_text.resize(count);
        return status;
    }
    ViStatus write(std::string_view text, int milliseconds = 5000)
    {
        std::size_t count = 0;
        return m_transport->write(std::as_bytes(std::span(text)), m_mode, within(milliseconds), count);
    }

    Driver m_driver;
    const os::SystemCalls m_calls = fakeCalls();
    const os::ReplacedSystemCalls m_replaced{m_calls};
    os::Wakeup m_nobody;
    std::unique_ptr<Transport> m_transport;
    TransferMode m_mode;
    std::string m_text;
};

// ---- Opening and closing --------------------------------------------------------------------------------------------

TEST_F(Serial, OpensRawWithTheStandardsDefaultsAndForItselfAlone)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    EXPECT_EQ(m_driver.log.at(0), "open /dev/ttyUSB7 noctty");
    EXPECT_EQ(m_driver.log.at(1), "exclusive");
    EXPECT_EQ(m_driver.line.c_lflag, 0u);
    EXPECT_EQ(m_driver.line.c_oflag, 0u);
    EXPECT_EQ(m_driver.line.c_iflag, static_cast<tcflag_t>(PARMRK | INPCK));
    EXPECT_EQ(m_driver.line.c_cflag & CBAUD, static_cast<tcflag_t>(BOTHER));
    EXPECT_EQ(m_driver.line.c_ospeed, 9600u);
    EXPECT_EQ(m_driver.line.c_ispeed, 9600u);
    EXPECT_EQ(m_driver.line.c_cflag & CSIZE, static_cast<tcflag_t>(CS8));
    EXPECT_EQ(m_driver.line.c_cflag & (PARENB | CSTOPB | CRTSCTS), 0u);
    EXPECT_NE(m_driver.line.c_cflag & CLOCAL, 0u) << "an unconnected carrier line must not matter";
    EXPECT_EQ(m_driver.modem & (TIOCM_DTR | TIOCM_RTS), TIOCM_DTR | TIOCM_RTS);
}

TEST_F(Serial, ClosingPutsBackTheSettingsThatWereFound)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    m_transport->close();
    EXPECT_EQ(m_driver.line.c_lflag, static_cast<tcflag_t>(ICANON | ECHO));
    EXPECT_EQ(m_driver.line.c_cflag, static_cast<tcflag_t>(CLOCAL | CREAD | CS7 | PARENB));
    EXPECT_EQ(read(), VI_ERROR_CONN_LOST);
    EXPECT_EQ(write("x"), VI_ERROR_CONN_LOST);
}

TEST_F(Serial, ClosingLetsOutWhatWasWritten)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    EXPECT_EQ(write("OUTP OFF\n"), VI_SUCCESS);
    m_driver.unsent = 2;
    m_driver.log.clear();
    m_transport->close();
    EXPECT_EQ(m_driver.log, (std::vector<std::string>{"outq 2", "outq 1", "outq 0"}));
}

TEST_F(Serial, ClosingIsNotHeldByALineThatStandsStill)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    EXPECT_EQ(write("OUTP OFF\n"), VI_SUCCESS);
    m_driver.unsent = 9;
    m_driver.moves = false;
    m_transport->close();
    EXPECT_EQ(m_driver.log.back(), "drop output");
}

TEST_F(Serial, ClosingDropsTheRestOfAMessageThatWasStopped)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    m_driver.takesOutput = false;
    EXPECT_EQ(write("OUTP OFF\n", 30), VI_ERROR_TMO);
    m_driver.unsent = 2;
    m_driver.log.clear();
    m_transport->close();
    EXPECT_EQ(m_driver.log, (std::vector<std::string>{"drop output"}));
}

TEST_F(Serial, SaysWhyAPortDoesNotOpen)
{
    m_driver.locked = true;
    EXPECT_EQ(connect(), VI_ERROR_RSRC_BUSY);
    m_driver.locked = false;
    m_driver.terminal = false;
    EXPECT_EQ(connect(), VI_ERROR_RSRC_NFOUND);
    for (const auto &[error, status] : std::map<int, ViStatus>{
             {ENOENT, VI_ERROR_RSRC_NFOUND}, {EBUSY, VI_ERROR_RSRC_BUSY}, {EACCES, VI_ERROR_NPERMISSION}}) {
        m_driver.openError = error;
        EXPECT_EQ(connect(), status) << error;
    }
}

// ---- Attributes -----------------------------------------------------------------------------------------------------

struct LineRow {
    const char *name;
    ViAttr attribute;
    std::int64_t value;
    std::function<bool(const Driver &)> holds;
};

tcflag_t flags(const Driver &driver, tcflag_t mask)
{
    return driver.line.c_cflag & mask;
}

constexpr tcflag_t ParityMask = PARENB | PARODD | CMSPAR;

class SerialAttribute : public Serial, public testing::WithParamInterface<LineRow>
{
};

TEST_P(SerialAttribute, ReachesTheDriver)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    const LineRow &row = GetParam();
    EXPECT_EQ(set(row.attribute, row.value), VI_SUCCESS);
    EXPECT_TRUE(row.holds(m_driver));
}

TEST_P(SerialAttribute, OfASessionReachesTheDriver)
{
    ResourceName name;
    ASSERT_EQ(parseResourceName("ASRL/dev/ttyUSB7::INSTR", name), VI_SUCCESS);
    InstrumentSession session(Library::instance(), name, kind::Serial, VI_NULL);
    ASSERT_EQ(session.open(1, VI_NO_LOCK, 2000, os::Deadline::never()), VI_SUCCESS);
    const LineRow &row = GetParam();
    EXPECT_FALSE(row.holds(m_driver)) << "or the row would show nothing";
    EXPECT_EQ(session.setAttribute(row.attribute, static_cast<ViAttrState>(row.value)), VI_SUCCESS);
    EXPECT_TRUE(row.holds(m_driver));
    EXPECT_EQ(session.close(), VI_SUCCESS);
}

TEST_F(Serial, EndsAndReplacementOfASessionAreThoseOfItsAttributes)
{
    ResourceName name;
    ASSERT_EQ(parseResourceName("ASRL/dev/ttyUSB7::INSTR", name), VI_SUCCESS);
    InstrumentSession session(Library::instance(), name, kind::Serial, VI_NULL);
    ASSERT_EQ(session.open(1, VI_NO_LOCK, 2000, os::Deadline::never()), VI_SUCCESS);
    const std::string data = "ab";
    std::size_t count = 0;
    ASSERT_EQ(session.setAttribute(VI_ATTR_ASRL_END_OUT, VI_ASRL_END_TERMCHAR), VI_SUCCESS);
    ASSERT_EQ(session.setAttribute(VI_ATTR_TERMCHAR, ';'), VI_SUCCESS);
    EXPECT_EQ(session.write(std::as_bytes(std::span(data)), count), VI_SUCCESS);
    EXPECT_EQ(std::exchange(m_driver.output, {}), "ab;");
    ASSERT_EQ(session.setAttribute(VI_ATTR_SEND_END_EN, VI_FALSE), VI_SUCCESS);
    EXPECT_EQ(session.write(std::as_bytes(std::span(data)), count), VI_SUCCESS);
    EXPECT_EQ(std::exchange(m_driver.output, {}), "ab");

    std::string room(8, '\0');
    const auto read = [&] { return session.read(std::as_writable_bytes(std::span(room)), count); };
    m_driver.input = "1\n2;3";
    EXPECT_EQ(read(), VI_SUCCESS) << "END is the termination character";
    EXPECT_EQ(room.substr(0, count), "1\n2;");
    ASSERT_EQ(session.setAttribute(VI_ATTR_ASRL_END_IN, VI_ASRL_END_LAST_BIT), VI_SUCCESS);
    m_driver.input = ";\xC1z";
    EXPECT_EQ(read(), VI_SUCCESS);
    EXPECT_EQ(room.substr(0, count), "3;\xC1");
    ASSERT_EQ(session.setAttribute(VI_ATTR_ASRL_REPLACE_CHAR, '?'), VI_SUCCESS);
    m_driver.input = std::string("\xFF\0x", 3);
    EXPECT_EQ(read(), VI_ERROR_ASRL_FRAMING);
    EXPECT_EQ(room.substr(0, count), "z?");
    EXPECT_EQ(session.close(), VI_SUCCESS);
}

INSTANTIATE_TEST_SUITE_P(
    All, SerialAttribute,
    testing::Values(
        LineRow{"Baud", VI_ATTR_ASRL_BAUD, 115200,
                [](const Driver &d) { return d.line.c_ospeed == 115200 && d.line.c_ispeed == 115200; }},
        LineRow{"OddBaud", VI_ATTR_ASRL_BAUD, 12345, [](const Driver &d) { return d.line.c_ospeed == 12345; }},
        LineRow{"FiveBits", VI_ATTR_ASRL_DATA_BITS, 5, [](const Driver &d) { return flags(d, CSIZE) == CS5; }},
        LineRow{"SixBits", VI_ATTR_ASRL_DATA_BITS, 6, [](const Driver &d) { return flags(d, CSIZE) == CS6; }},
        LineRow{"SevenBits", VI_ATTR_ASRL_DATA_BITS, 7, [](const Driver &d) { return flags(d, CSIZE) == CS7; }},
        LineRow{
            "Odd", VI_ATTR_ASRL_PARITY, VI_ASRL_PAR_ODD,
            [](const Driver &d) { return flags(d, ParityMask) == (PARENB | PARODD) && (d.line.c_iflag & INPCK) != 0; }},
        LineRow{"Even", VI_ATTR_ASRL_PARITY, VI_ASRL_PAR_EVEN,
                [](const Driver &d) { return flags(d, ParityMask) == PARENB; }},
        LineRow{"Mark", VI_ATTR_ASRL_PARITY, VI_ASRL_PAR_MARK,
                [](const Driver &d) { return flags(d, ParityMask) == (PARENB | PARODD | CMSPAR); }},
        LineRow{"Space", VI_ATTR_ASRL_PARITY, VI_ASRL_PAR_SPACE,
                [](const Driver &d) { return flags(d, ParityMask) == (PARENB | CMSPAR); }},
        LineRow{"TwoStopBits", VI_ATTR_ASRL_STOP_BITS, VI_ASRL_STOP_TWO,
                [](const Driver &d) { return flags(d, CSTOPB) == CSTOPB; }},
        LineRow{"XonXoff", VI_ATTR_ASRL_FLOW_CNTRL, VI_ASRL_FLOW_XON_XOFF,
                [](const Driver &d) {
                    return (d.line.c_iflag & (IXON | IXOFF)) == (IXON | IXOFF) && flags(d, CRTSCTS) == 0;
                }},
        LineRow{"RtsCts", VI_ATTR_ASRL_FLOW_CNTRL, VI_ASRL_FLOW_RTS_CTS,
                [](const Driver &d) { return flags(d, CRTSCTS) == CRTSCTS && (d.line.c_iflag & IXON) == 0; }},
        LineRow{"RtsCtsAndDtrDsr", VI_ATTR_ASRL_FLOW_CNTRL, VI_ASRL_FLOW_RTS_CTS | VI_ASRL_FLOW_DTR_DSR,
                [](const Driver &d) { return flags(d, CRTSCTS) == CRTSCTS; }},
        LineRow{"XonChar", VI_ATTR_ASRL_XON_CHAR, 0x21, [](const Driver &d) { return d.line.c_cc[VSTART] == 0x21; }},
        LineRow{"XoffChar", VI_ATTR_ASRL_XOFF_CHAR, 0x22, [](const Driver &d) { return d.line.c_cc[VSTOP] == 0x22; }},
        LineRow{"DtrOff", VI_ATTR_ASRL_DTR_STATE, VI_STATE_UNASSERTED,
                [](const Driver &d) { return (d.modem & (TIOCM_DTR | TIOCM_RTS)) == TIOCM_RTS; }},
        LineRow{"RtsOff", VI_ATTR_ASRL_RTS_STATE, VI_STATE_UNASSERTED,
                [](const Driver &d) { return (d.modem & (TIOCM_DTR | TIOCM_RTS)) == TIOCM_DTR; }}),
    [](const auto &row) { return std::string(row.param.name); });

TEST_F(Serial, RtsIsTheDriversWhileItDoesFlowControl)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    ASSERT_EQ(set(VI_ATTR_ASRL_FLOW_CNTRL, VI_ASRL_FLOW_RTS_CTS), VI_SUCCESS);
    EXPECT_EQ(set(VI_ATTR_ASRL_RTS_STATE, VI_STATE_UNASSERTED), VI_SUCCESS);
    EXPECT_NE(m_driver.modem & TIOCM_RTS, 0);
}

TEST_F(Serial, OneAndAHalfStopBitsGoWithFiveDataBitsAlone)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    EXPECT_EQ(set(VI_ATTR_ASRL_STOP_BITS, VI_ASRL_STOP_ONE5), VI_ERROR_NSUP_ATTR_STATE);
    EXPECT_EQ(flags(m_driver, CSTOPB), 0u);
    ASSERT_EQ(set(VI_ATTR_ASRL_DATA_BITS, 5), VI_SUCCESS);
    EXPECT_EQ(set(VI_ATTR_ASRL_STOP_BITS, VI_ASRL_STOP_TWO), VI_ERROR_NSUP_ATTR_STATE);
    EXPECT_EQ(set(VI_ATTR_ASRL_STOP_BITS, VI_ASRL_STOP_ONE5), VI_SUCCESS);
    EXPECT_EQ(flags(m_driver, CSTOPB), static_cast<tcflag_t>(CSTOPB));
}

TEST_F(Serial, WhatThePortCannotDoIsRefusedAndChangesNothing)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    EXPECT_EQ(set(VI_ATTR_ASRL_BAUD, 0), VI_ERROR_NSUP_ATTR_STATE);
    m_driver.limits = [](termios2 &line) { line.c_ospeed = std::min(line.c_ospeed, 19200u); };
    EXPECT_EQ(set(VI_ATTR_ASRL_BAUD, 115200), VI_ERROR_NSUP_ATTR_STATE);
    EXPECT_EQ(m_driver.line.c_ospeed, 9600u);
    EXPECT_EQ(set(VI_ATTR_ASRL_BAUD, 19300), VI_SUCCESS) << "half a percent is near enough";
    m_driver.limits = [](termios2 &line) { line.c_cflag |= CS8; };
    EXPECT_EQ(set(VI_ATTR_ASRL_DATA_BITS, 7), VI_ERROR_NSUP_ATTR_STATE);
}

TEST_F(Serial, TellsTheModemLines)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    EXPECT_EQ(get(VI_ATTR_ASRL_CTS_STATE), VI_STATE_ASSERTED);
    EXPECT_EQ(get(VI_ATTR_ASRL_DCD_STATE), VI_STATE_ASSERTED);
    EXPECT_EQ(get(VI_ATTR_ASRL_DSR_STATE), VI_STATE_UNASSERTED);
    EXPECT_EQ(get(VI_ATTR_ASRL_RI_STATE), VI_STATE_UNASSERTED);
    EXPECT_EQ(get(VI_ATTR_ASRL_DTR_STATE), VI_STATE_ASSERTED);
    EXPECT_EQ(get(VI_ATTR_ASRL_RTS_STATE), VI_STATE_ASSERTED);
    m_driver.modem = TIOCM_DSR | TIOCM_RI;
    EXPECT_EQ(get(VI_ATTR_ASRL_CTS_STATE), VI_STATE_UNASSERTED);
    EXPECT_EQ(get(VI_ATTR_ASRL_DSR_STATE), VI_STATE_ASSERTED);
    EXPECT_EQ(get(VI_ATTR_ASRL_RI_STATE), VI_STATE_ASSERTED);
}

TEST_F(Serial, PortWithoutModemLinesSaysSo)
{
    m_driver.hasModemLines = false;
    ASSERT_EQ(connect(), VI_SUCCESS);
    EXPECT_EQ(get(VI_ATTR_ASRL_CTS_STATE), VI_STATE_UNKNOWN);
    EXPECT_EQ(get(VI_ATTR_ASRL_DTR_STATE), VI_STATE_UNKNOWN);
    EXPECT_EQ(set(VI_ATTR_ASRL_DTR_STATE, VI_STATE_UNASSERTED), VI_ERROR_NSUP_ATTR_STATE);
}

TEST_F(Serial, CountsWhatWaitsHereAndInTheSystem)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    m_driver.input = "abcdef\n";
    EXPECT_EQ(get(VI_ATTR_ASRL_AVAIL_NUM), 7);
    EXPECT_EQ(read(2), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(get(VI_ATTR_ASRL_AVAIL_NUM), 5);
    m_driver.input = "gh";
    EXPECT_EQ(get(VI_ATTR_ASRL_AVAIL_NUM), 7);
}

// ---- Ends -----------------------------------------------------------------------------------------------------------

struct SerialEnd {
    const char *name;
    int endIn;
    bool termCharEnabled;
    bool suppressEnd;
    std::size_t size;
    ViStatus expected;
    std::string text;
};

class SerialReadEnd : public Serial, public testing::WithParamInterface<SerialEnd>
{
};

TEST_P(SerialReadEnd, IsDecidedByTheEndMode)
{
    const SerialEnd &row = GetParam();
    ASSERT_EQ(connect(), VI_SUCCESS);
    ASSERT_EQ(set(VI_ATTR_ASRL_END_IN, row.endIn), VI_SUCCESS);
    m_mode.termCharEnabled = row.termCharEnabled;
    m_mode.suppressEnd = row.suppressEnd;
    m_driver.input = "ab\nc\xE4z";
    EXPECT_EQ(read(row.size), row.expected);
    EXPECT_EQ(m_text, row.text);
}

INSTANTIATE_TEST_SUITE_P(
    All, SerialReadEnd,
    testing::Values(
        SerialEnd{"TermCharIsTheEnd", VI_ASRL_END_TERMCHAR, false, false, 64, VI_SUCCESS, "ab\n"},
        SerialEnd{"EndWinsOverTermChar", VI_ASRL_END_TERMCHAR, true, false, 64, VI_SUCCESS, "ab\n"},
        SerialEnd{"EndWinsOverCount", VI_ASRL_END_TERMCHAR, false, false, 3, VI_SUCCESS, "ab\n"},
        SerialEnd{"SuppressedEnd", VI_ASRL_END_TERMCHAR, false, true, 4, VI_SUCCESS_MAX_CNT, "ab\nc"},
        SerialEnd{"SuppressedEndAndTermChar", VI_ASRL_END_TERMCHAR, true, true, 64, VI_SUCCESS_TERM_CHAR, "ab\n"},
        SerialEnd{"None", VI_ASRL_END_NONE, false, false, 64, VI_ERROR_TMO, "ab\nc\xE4z"},
        SerialEnd{"NoneAndTermChar", VI_ASRL_END_NONE, true, false, 64, VI_SUCCESS_TERM_CHAR, "ab\n"},
        SerialEnd{"NoneAndCount", VI_ASRL_END_NONE, false, false, 6, VI_SUCCESS_MAX_CNT, "ab\nc\xE4z"},
        SerialEnd{"LastBit", VI_ASRL_END_LAST_BIT, false, false, 64, VI_SUCCESS, "ab\nc\xE4"},
        SerialEnd{"LastBitAndTermChar", VI_ASRL_END_LAST_BIT, true, false, 64, VI_SUCCESS_TERM_CHAR, "ab\n"}),
    [](const auto &row) { return std::string(row.param.name); });

TEST_F(Serial, LastBitIsThatOfTheDataBits)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    ASSERT_EQ(set(VI_ATTR_ASRL_DATA_BITS, 7), VI_SUCCESS);
    ASSERT_EQ(set(VI_ATTR_ASRL_END_IN, VI_ASRL_END_LAST_BIT), VI_SUCCESS);
    m_driver.input = "12A34";
    EXPECT_EQ(read(), VI_SUCCESS);
    EXPECT_EQ(m_text, "12A");
}

TEST_F(Serial, WritesTheEndThatWasAgreedOn)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    EXPECT_EQ(write("ab\xE1"), VI_SUCCESS);
    EXPECT_EQ(std::exchange(m_driver.output, {}), "ab\xE1");
    ASSERT_EQ(set(VI_ATTR_ASRL_END_OUT, VI_ASRL_END_TERMCHAR), VI_SUCCESS);
    m_mode.termChar = ';';
    EXPECT_EQ(write("ab"), VI_SUCCESS);
    EXPECT_EQ(std::exchange(m_driver.output, {}), "ab;");
    ASSERT_EQ(set(VI_ATTR_ASRL_END_OUT, VI_ASRL_END_LAST_BIT), VI_SUCCESS);
    EXPECT_EQ(write("\xE1 b"), VI_SUCCESS);
    EXPECT_EQ(std::exchange(m_driver.output, {}), "a \xE2");
    m_mode.sendEnd = false;
    EXPECT_EQ(write("\xE1 b"), VI_SUCCESS);
    EXPECT_EQ(std::exchange(m_driver.output, {}), "a b");
    ASSERT_EQ(set(VI_ATTR_ASRL_END_OUT, VI_ASRL_END_TERMCHAR), VI_SUCCESS);
    EXPECT_EQ(write("ab"), VI_SUCCESS);
    EXPECT_EQ(std::exchange(m_driver.output, {}), "ab");
}

TEST_F(Serial, BreakComesBehindTheLastBit)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    ASSERT_EQ(set(VI_ATTR_ASRL_END_OUT, VI_ASRL_END_BREAK), VI_SUCCESS);
    m_driver.unsent = 2;
    m_driver.log.clear();
    EXPECT_EQ(write("ab"), VI_SUCCESS);
    EXPECT_EQ(m_driver.log, (std::vector<std::string>{"write", "outq 2", "outq 1", "outq 0", "break on", "break off"}));
}

TEST_F(Serial, BreakComesBehindWhatTheChipStillHolds)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    ASSERT_EQ(set(VI_ATTR_ASRL_END_OUT, VI_ASRL_END_BREAK), VI_SUCCESS);
    m_driver.inTheChip = 2;
    m_driver.log.clear();
    EXPECT_EQ(write("ab"), VI_SUCCESS);
    EXPECT_EQ(m_driver.log, (std::vector<std::string>{"write", "outq 0", "outq 0", "outq 0", "break on", "break off"}));
}

TEST_F(Serial, PortThatCannotBreakIsNotLost)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    m_driver.breakError = EOPNOTSUPP;
    m_driver.input = "old\n";
    EXPECT_EQ(m_transport->clear(within(5000)), VI_SUCCESS);
    EXPECT_EQ(read(), VI_ERROR_TMO);
    EXPECT_EQ(write("x"), VI_SUCCESS);
    ASSERT_EQ(set(VI_ATTR_ASRL_END_OUT, VI_ASRL_END_BREAK), VI_SUCCESS);
    EXPECT_EQ(write("x"), VI_ERROR_INV_SETUP);
    m_driver.breakError = EIO;
    EXPECT_EQ(m_transport->clear(within(5000)), VI_ERROR_CONN_LOST);
    EXPECT_EQ(write("x"), VI_ERROR_CONN_LOST);
}

TEST_F(Serial, ClearDropsOutputBreaksAndDropsInput)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    m_driver.input = "old\n";
    m_driver.log.clear();
    EXPECT_EQ(m_transport->clear(within(5000)), VI_SUCCESS);
    EXPECT_EQ(m_driver.log, (std::vector<std::string>{"drop output", "break on", "break off", "drop input"}));
    EXPECT_EQ(read(), VI_ERROR_TMO);
}

TEST_F(Serial, BreakEndsAlsoWhenTheCallDoes)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    m_driver.log.clear();
    EXPECT_EQ(m_transport->clear(within(5)), VI_ERROR_TMO);
    EXPECT_EQ(m_driver.log, (std::vector<std::string>{"drop output", "break on", "break off", "drop input"}));
}

TEST_F(Serial, FlushesTheSystemsBuffers)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    m_driver.log.clear();
    EXPECT_EQ(m_transport->flushLine(VI_ASRL_IN_BUF_DISCARD, within(1000)), VI_SUCCESS);
    EXPECT_EQ(m_transport->flushLine(VI_ASRL_OUT_BUF_DISCARD, within(1000)), VI_SUCCESS);
    m_driver.unsent = 1;
    EXPECT_EQ(m_transport->flushLine(VI_ASRL_OUT_BUF, within(1000)), VI_SUCCESS);
    EXPECT_EQ(m_driver.log, (std::vector<std::string>{"drop input", "drop output", "outq 1", "outq 0"}));
    m_driver.unsent = 1'000'000;
    EXPECT_EQ(m_transport->flushLine(VI_ASRL_OUT_BUF, within(20)), VI_ERROR_TMO);
}

TEST_F(Serial, DropsAnAnswerThatCameAfterItsTimeOut)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    EXPECT_EQ(read(), VI_ERROR_TMO);
    m_driver.input = "late\n";
    EXPECT_EQ(write("2?\n"), VI_SUCCESS);
    m_driver.input += "two\n";
    EXPECT_EQ(read(), VI_SUCCESS);
    EXPECT_EQ(m_text, "two\n");
}

TEST_F(Serial, StatusByteAndTriggerAreStringsWhereTheUserWantsThat)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    ViUInt16 status = 0;
    EXPECT_EQ(m_transport->readStatusByte(m_mode, within(30), status), VI_ERROR_INV_SETUP);
    EXPECT_EQ(m_transport->trigger(m_mode, within(30)), VI_ERROR_INV_SETUP);
    m_mode.protocol = VI_PROT_4882_STRS;
    m_driver.input = "+66\r\n";
    EXPECT_EQ(m_transport->readStatusByte(m_mode, within(30), status), VI_SUCCESS);
    EXPECT_EQ(status, 66);
    EXPECT_EQ(m_transport->trigger(m_mode, within(30)), VI_SUCCESS);
    EXPECT_EQ(m_driver.output, "*STB?\n*TRG\n");
}

// ---- Errors on the line ---------------------------------------------------------------------------------------------

TEST_F(Serial, ByteWithAnErrorIsReplacedAndEndsTheRead)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    ASSERT_EQ(set(VI_ATTR_ASRL_PARITY, VI_ASRL_PAR_EVEN), VI_SUCCESS);
    ASSERT_EQ(set(VI_ATTR_ASRL_REPLACE_CHAR, '?'), VI_SUCCESS);
    m_driver.input = std::string("ab\xFF\0xcd\n", 8);
    m_driver.counters.parity = 1;
    EXPECT_EQ(read(), VI_ERROR_ASRL_PARITY);
    EXPECT_EQ(m_text, "ab?");
    EXPECT_EQ(read(), VI_SUCCESS);
    EXPECT_EQ(m_text, "cd\n");
}

TEST_F(Serial, FramingErrorsAreToldFromParityErrorsByTheDriversCounters)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    ASSERT_EQ(set(VI_ATTR_ASRL_PARITY, VI_ASRL_PAR_EVEN), VI_SUCCESS);
    m_driver.input = std::string("\xFF\0x", 3);
    m_driver.counters.frame = 1;
    EXPECT_EQ(read(), VI_ERROR_ASRL_FRAMING);
    EXPECT_EQ(m_text, std::string(1, '\0'));
    m_driver.countsErrors = false;
    m_driver.input = std::string("\xFF\0x", 3);
    EXPECT_EQ(read(), VI_ERROR_ASRL_PARITY) << "without counters, what was asked to be checked";
    ASSERT_EQ(set(VI_ATTR_ASRL_PARITY, VI_ASRL_PAR_NONE), VI_SUCCESS);
    m_driver.input = std::string("\xFF\0x", 3);
    EXPECT_EQ(read(), VI_ERROR_ASRL_FRAMING);
}

TEST_F(Serial, ErrorsOfBothKindsAreToldOneByOne)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    ASSERT_EQ(set(VI_ATTR_ASRL_PARITY, VI_ASRL_PAR_EVEN), VI_SUCCESS);
    m_driver.input = std::string("\xFF\0x\xFF\0y", 6);
    m_driver.counters.parity = 1;
    m_driver.counters.frame = 1;
    EXPECT_EQ(read(), VI_ERROR_ASRL_PARITY);
    EXPECT_EQ(read(), VI_ERROR_ASRL_FRAMING);
}

TEST_F(Serial, OverrunIsToldBehindWhatArrived)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    m_driver.input = "ab";
    m_driver.counters.overrun = 3;
    EXPECT_EQ(read(), VI_ERROR_ASRL_OVERRUN);
    EXPECT_EQ(m_text, "ab");
    m_driver.input = "cd\n";
    EXPECT_EQ(read(), VI_SUCCESS);
    EXPECT_EQ(m_text, "cd\n");
}

TEST_F(Serial, AllOtherBytesPassAlsoWhenTheMarksAreSplit)
{
    ASSERT_EQ(connect(), VI_SUCCESS);
    ASSERT_EQ(set(VI_ATTR_ASRL_END_IN, VI_ASRL_END_NONE), VI_SUCCESS);
    std::string sent;
    std::string marked;
    for (int byte = 0; byte < 256; ++byte) {
        sent += static_cast<char>(byte);
        marked += byte == 0xFF ? "\xFF\xFF" : std::string(1, static_cast<char>(byte));
    }
    std::string got;
    for (const char byte : marked) {
        m_driver.input = byte;
        if (read(1) == VI_SUCCESS_MAX_CNT)
            got += m_text;
    }
    EXPECT_EQ(got, sent);
}

// ---- Ports by number ------------------------------------------------------------------------------------------------

TEST(SerialPorts, RealOnesInAnOrderThatStays)
{
    const test::TemporaryFolder root;
    const auto port = [&](const std::string &name, const char *type) {
        const std::filesystem::path folder = root.file("sys/class/tty/" + name);
        std::filesystem::create_directories(folder);
        if (type) {
            std::filesystem::create_directories(folder / "device/driver");
            std::ofstream(folder / "type") << type << '\n';
        }
    };
    port("ttyS10", "4");
    port("ttyS2", "4");
    port("ttyS3", "0");    // the driver's, without a chip
    port("tty7", nullptr); // a console
    port("ttyUSB0", "");
    port("ttyUSB1", "");
    port("ttyACM0", "");
    std::filesystem::create_directories(root.file("dev/serial/by-id"));
    std::filesystem::create_symlink("../../ttyUSB0", root.file("dev/serial/by-id/usb-Zeta"));
    std::filesystem::create_symlink("../../ttyUSB1", root.file("dev/serial/by-id/usb-Alpha"));
    for (const char *another : {"usb-Beta", "usb-Eta", "usb-Zulu"}) // the first name counts
        std::filesystem::create_symlink("../../ttyUSB1", root.file(std::string("dev/serial/by-id/") + another));
    EXPECT_EQ(os::serialPorts(root.file("")),
              (std::vector<std::string>{"/dev/ttyACM0", "/dev/ttyS2", "/dev/ttyS10", "/dev/ttyUSB1", "/dev/ttyUSB0"}));
    EXPECT_TRUE(os::serialPorts(root.file("nowhere")).empty());
}

} // namespace
