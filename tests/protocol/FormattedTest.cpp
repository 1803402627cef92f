// viPrintf, viScanf, viQueryf and their buffers on a real instrument.
#include "support/SimulatorProcess.h"
#include "support/VisaSession.h"

#include <array>
#include <cstdarg>
#include <gtest/gtest.h>
#include <thread>

using test::SimulatorProcess;
using test::VisaSession;

namespace
{

class Formatted : public testing::TestWithParam<const char *>
{
protected:
    void SetUp() override
    {
        ASSERT_EQ(m_session.open(m_simulator.resource(GetParam())), VI_SUCCESS);
        m_session.set(VI_ATTR_TMO_VALUE, 20000);
        m_session.set(VI_ATTR_TERMCHAR_EN, isSocket() ? VI_TRUE : VI_FALSE);
        vi = m_session.vi;
    }
    bool isSocket() const { return std::string(GetParam()) == "socket"; }

    SimulatorProcess m_simulator{{std::string("--") + GetParam(), "0"}};
    VisaSession m_session;
    ViSession vi = VI_NULL;
};

INSTANTIATE_TEST_SUITE_P(All, Formatted, testing::Values("hislip", "socket"),
                         [](const auto &service) { return std::string(service.param); });

TEST_P(Formatted, PrintsASettingAndQueriesIt)
{
    double voltage = 0;
    EXPECT_EQ(viPrintf(vi, "SOUR:VOLT %.2f\n", 3.25), VI_SUCCESS);
    EXPECT_EQ(viQueryf(vi, "SOUR:VOLT?\n", "%lf", &voltage), VI_SUCCESS);
    EXPECT_EQ(voltage, 3.25);
}

TEST_P(Formatted, TakesTheArgumentsOfTheQuestionFirst)
{
    int enabled = 0;
    char rest[16] = "";
    EXPECT_EQ(viQueryf(vi, "*ESE %d;*ESE?;*SRE?\n", "%d;%s", 17, &enabled, rest), VI_SUCCESS);
    EXPECT_EQ(enabled, 17);
    EXPECT_STREQ(rest, "0");
}

TEST_P(Formatted, ReadsTheErrorQueueAsTheInstrumentTestsDo)
{
    int code = 0;
    char quote = 0;
    EXPECT_EQ(viPrintf(vi, "NO:SUCH:HEADER\n"), VI_SUCCESS);
    EXPECT_EQ(viQueryf(vi, "SYST:ERR?\n", "%d,%c%*T", &code, &quote), VI_SUCCESS);
    EXPECT_EQ(code, -113);
    EXPECT_EQ(quote, '"');
    EXPECT_EQ(viQueryf(vi, "SYST:ERR?\n", "%d,%c%*T", &code, &quote), VI_SUCCESS);
    EXPECT_EQ(code, 0);
}

TEST_P(Formatted, MovesABinaryBlockThereAndBack)
{
    std::array<std::uint16_t, 5000> sent;
    for (std::size_t i = 0; i < sent.size(); ++i)
        sent[i] = static_cast<std::uint16_t>(i * 13); // line feeds among them
    EXPECT_EQ(viPrintf(vi, "MMEM:DATA \"block\",%*hb\n", static_cast<long>(sent.size()), sent.data()), VI_SUCCESS);
    std::array<std::uint16_t, 5000> received{};
    auto count = static_cast<long>(received.size());
    // On a socket the termination character would end the read inside the block.
    m_session.set(VI_ATTR_TERMCHAR_EN, VI_FALSE);
    EXPECT_EQ(viQueryf(vi, "MMEM:DATA? \"block\"\n", "%#hb%*T", &count, received.data()), VI_SUCCESS);
    EXPECT_EQ(count, 5000);
    EXPECT_EQ(received, sent);
}

TEST_P(Formatted, KeepsTextUntilALineEndsOrItIsFlushed)
{
    char answer[128] = "";
    EXPECT_EQ(viPrintf(vi, "*ES"), VI_SUCCESS);
    EXPECT_EQ(viPrintf(vi, "E 5"), VI_SUCCESS);
    if (isSocket())
        EXPECT_EQ(viPrintf(vi, "\n"), VI_SUCCESS); // END is nothing on a raw socket
    else
        EXPECT_EQ(viFlush(vi, VI_WRITE_BUF), VI_SUCCESS);
    EXPECT_EQ(viQueryf(vi, "*ESE?\n", "%s", answer), VI_SUCCESS);
    EXPECT_STREQ(answer, "5");
}

TEST_P(Formatted, ClearEmptiesBothBuffers)
{
    int value = 0;
    EXPECT_EQ(viQueryf(vi, "*ESE 3;*ESE?;*ESE?\n", "%d;", &value), VI_SUCCESS);
    EXPECT_EQ(viPrintf(vi, "*ESE 9;NO:SUCH"), VI_SUCCESS);
    EXPECT_EQ(viClear(vi), VI_SUCCESS);
    EXPECT_EQ(viPrintf(vi, "*SRE?\n"), VI_SUCCESS);
    EXPECT_EQ(viScanf(vi, "%d", &value), VI_SUCCESS);
    EXPECT_EQ(value, 0) << "neither the unread 3 nor the unsent 9";
}

TEST_P(Formatted, AnswersTheTimeOut)
{
    m_session.set(VI_ATTR_TMO_VALUE, 50);
    int value = 0;
    EXPECT_EQ(viScanf(vi, "%d", &value), VI_ERROR_TMO);
    m_session.set(VI_ATTR_TMO_VALUE, 20000);
    EXPECT_EQ(viQueryf(vi, "*ESE?\n", "%d", &value), VI_SUCCESS);
}

TEST_P(Formatted, BuffersPlainBytes)
{
    const std::string question = "*ESE 77;*ESE?\n";
    EXPECT_EQ(viBufWrite(vi, reinterpret_cast<ViConstBuf>(question.data()), static_cast<ViUInt32>(question.size()),
                         &m_session.count),
              VI_SUCCESS);
    EXPECT_EQ(m_session.count, question.size());
    EXPECT_EQ(viFlush(vi, VI_WRITE_BUF), VI_SUCCESS);
    std::array<ViByte, 16> answer{};
    EXPECT_EQ(viBufRead(vi, answer.data(), 1, &m_session.count), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(viBufRead(vi, answer.data() + 1, 10, &m_session.count), isSocket() ? VI_SUCCESS_TERM_CHAR : VI_SUCCESS);
    EXPECT_EQ(m_session.count, 2u);
    EXPECT_STREQ(reinterpret_cast<char *>(answer.data()), "77\n");
    EXPECT_EQ(viBufRead(vi, answer.data(), 0, nullptr), VI_SUCCESS_MAX_CNT);
}

TEST_P(Formatted, ChangesTheSizesOfItsBuffers)
{
    EXPECT_EQ(m_session.get<ViUInt32>(VI_ATTR_RD_BUF_SIZE), 4096u);
    EXPECT_EQ(viSetBuf(vi, VI_READ_BUF | VI_WRITE_BUF, 10), VI_SUCCESS);
    EXPECT_EQ(m_session.get<ViUInt32>(VI_ATTR_RD_BUF_SIZE), 10u);
    EXPECT_EQ(m_session.get<ViUInt32>(VI_ATTR_WR_BUF_SIZE), 10u);
    char text[256] = "";
    EXPECT_EQ(viQueryf(vi, "%s\n", "%T", "*ESE 1;*ESE?;:SYST:VERS?", text), VI_SUCCESS);
    EXPECT_STREQ(text, "1;1999.0\n");
    EXPECT_EQ(viSetBuf(vi, VI_READ_BUF, 0), VI_WARN_NSUP_BUF);
    EXPECT_EQ(m_session.get<ViUInt32>(VI_ATTR_RD_BUF_SIZE), 10u);
}

TEST_P(Formatted, RefusesMasksThatContradictThemselves)
{
    for (const ViUInt16 mask : {0, VI_READ_BUF | VI_READ_BUF_DISCARD, VI_WRITE_BUF | VI_WRITE_BUF_DISCARD, 0x100})
        EXPECT_EQ(viFlush(vi, static_cast<ViUInt16>(mask)), VI_ERROR_INV_MASK) << mask;
    EXPECT_EQ(viSetBuf(vi, VI_READ_BUF_DISCARD, 100), VI_ERROR_INV_MASK);
    EXPECT_EQ(viFlush(vi, VI_READ_BUF_DISCARD | VI_WRITE_BUF_DISCARD), VI_SUCCESS);
}

TEST_P(Formatted, RefusesWhatIsNoFormatBeforeAnythingIsSent)
{
    int value = 0;
    EXPECT_EQ(viPrintf(vi, "*ESE 99\n%q"), VI_ERROR_INV_FMT);
    EXPECT_EQ(viQueryf(vi, "*ESE 98\n", "%q"), VI_ERROR_INV_FMT);
    EXPECT_EQ(viPrintf(vi, nullptr), VI_ERROR_INV_FMT);
    EXPECT_EQ(viScanf(vi, nullptr), VI_ERROR_INV_FMT);
    EXPECT_EQ(viQueryf(vi, "*ESE?\n", "%d", &value), VI_SUCCESS);
    EXPECT_EQ(value, 0);
}

TEST_P(Formatted, PrintsAndScansTextWithoutTheInstrument)
{
    std::array<ViByte, 64> buffer{};
    int value = 0;
    EXPECT_EQ(viSPrintf(vi, buffer.data(), "VOLT %d\n", 12), VI_SUCCESS);
    EXPECT_STREQ(reinterpret_cast<char *>(buffer.data()), "VOLT 12\n");
    EXPECT_EQ(viSScanf(vi, buffer.data(), "VOLT %d", &value), VI_SUCCESS);
    EXPECT_EQ(value, 12);
    EXPECT_EQ(viSPrintf(vi, nullptr, "x"), VI_ERROR_USER_BUF);
    EXPECT_EQ(viSScanf(vi, nullptr, "%d", &value), VI_ERROR_USER_BUF);
}

ViStatus callV(ViStatus (*operation)(ViSession, ViConstString, ViVAList), ViSession vi, ViConstString format, ...)
{
    va_list list;
    va_start(list, format);
    const ViStatus status = operation(vi, format, list);
    va_end(list);
    return status;
}

ViStatus callVQuery(ViSession vi, ViConstString output, ViConstString input, ...)
{
    va_list list;
    va_start(list, input);
    const ViStatus status = viVQueryf(vi, output, input, list);
    va_end(list);
    return status;
}

TEST_P(Formatted, TakesArgumentLists)
{
    int value = 0;
    EXPECT_EQ(callV(viVPrintf, vi, "*ESE %d;*ESE?\n", 5), VI_SUCCESS);
    EXPECT_EQ(callV(viVScanf, vi, "%d%*T", &value), VI_SUCCESS);
    EXPECT_EQ(value, 5);
    EXPECT_EQ(callVQuery(vi, "*ESE %d;*ESE?\n", "%d%*T", 6, &value), VI_SUCCESS);
    EXPECT_EQ(value, 6);
}

TEST_P(Formatted, StaysOutWhileAnotherSessionHoldsALock)
{
    VisaSession other;
    ASSERT_EQ(other.open(m_simulator.resource(GetParam())), VI_SUCCESS);
    ASSERT_EQ(viLock(other.vi, VI_EXCLUSIVE_LOCK, 1000, nullptr, nullptr), VI_SUCCESS);
    m_session.set(VI_ATTR_TMO_VALUE, 50);
    int value = 0;
    EXPECT_EQ(viScanf(vi, "%d", &value), VI_ERROR_RSRC_LOCKED);
    // Where the instrument keeps the lock it is asked when there is something to send.
    const ViStatus withoutSending = isSocket() ? VI_ERROR_RSRC_LOCKED : VI_SUCCESS;
    EXPECT_EQ(viPrintf(vi, "*CLS"), withoutSending);
    EXPECT_EQ(viFlush(vi, VI_READ_BUF_DISCARD), withoutSending);
}

TEST_P(Formatted, CloseEndsAScanThatWaits)
{
    m_session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    std::thread closer([&] {
        std::this_thread::sleep_for(std::chrono::milliseconds(50));
        viClose(vi);
    });
    int value = 0;
    EXPECT_EQ(viScanf(vi, "%d", &value), VI_ERROR_INV_OBJECT);
    closer.join();
}

} // namespace
