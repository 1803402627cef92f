// libkyvisa.so against KyVisaSimulator: what holds over every protocol, then what each has of its own.
#include "support/SimulatorProcess.h"
#include "support/VisaSession.h"

#include <algorithm>
#include <csignal>
#include <gtest/gtest.h>
#include <thread>

using test::SimulatorProcess;
using test::VisaSession;

namespace
{

struct Service {
    const char *name;
    std::vector<std::string> options;
};

class Simulator : public testing::TestWithParam<Service>
{
protected:
    void SetUp() override { prepare(m_session); }

    void prepare(VisaSession &session)
    {
        ASSERT_EQ(session.open(m_simulator.resource(GetParam().name)), VI_SUCCESS);
        session.set(VI_ATTR_TMO_VALUE, 20000);
        session.set(VI_ATTR_TERMCHAR_EN, isSocket() ? VI_TRUE : VI_FALSE);
    }
    bool isSocket() const { return std::string(GetParam().name) == "socket"; }
    ViStatus endOfLine() const { return isSocket() ? VI_SUCCESS_TERM_CHAR : VI_SUCCESS; }
    std::string query(VisaSession &session, const std::string &question)
    {
        EXPECT_EQ(session.write(question + "\n"), VI_SUCCESS);
        EXPECT_EQ(session.read(), endOfLine());
        return session.text;
    }

    SimulatorProcess m_simulator{GetParam().options};
    VisaSession m_session;
};

INSTANTIATE_TEST_SUITE_P(All, Simulator,
                         testing::Values(Service{"hislip", {"--hislip", "0"}}, Service{"socket", {"--socket", "0"}}),
                         [](const auto &service) { return std::string(service.param.name); });

TEST_P(Simulator, IdentifiesItself)
{
    const std::string identification = query(m_session, "*IDN?");
    EXPECT_EQ(std::count(identification.begin(), identification.end(), ','), 3);
    EXPECT_EQ(identification.back(), '\n');
}

TEST_P(Simulator, AnswersAThousandQueriesInOrder)
{
    for (int i = 0; i < 1000; ++i)
        ASSERT_EQ(query(m_session, "*ESE " + std::to_string(i % 256) + ";*ESE?"), std::to_string(i % 256) + "\n");
}

TEST_P(Simulator, KeepsABlockOfAllBytes)
{
    std::string block(300'000, '\0');
    for (std::size_t i = 0; i < block.size(); ++i)
        block[i] = static_cast<char>(i + i / 253);
    ASSERT_EQ(m_session.write("MMEM:DATA \"block\",#6300000" + block + "\n"), VI_SUCCESS);
    ASSERT_EQ(m_session.write("MMEM:DATA? \"block\"\n"), VI_SUCCESS);
    m_session.set(VI_ATTR_TERMCHAR_EN, VI_FALSE);
    EXPECT_EQ(m_session.read(8), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(m_session.text, "#6300000");
    EXPECT_EQ(m_session.read(300'000), VI_SUCCESS_MAX_CNT);
    EXPECT_TRUE(m_session.text == block);
    EXPECT_EQ(m_session.read(1), isSocket() ? VI_SUCCESS_MAX_CNT : VI_SUCCESS);
    EXPECT_EQ(m_session.text, "\n");
}

TEST_P(Simulator, TimesOutWhenNothingWasAsked)
{
    m_session.set(VI_ATTR_TMO_VALUE, 100);
    EXPECT_EQ(m_session.read(), VI_ERROR_TMO);
    EXPECT_EQ(m_session.count, 0u);
    m_session.set(VI_ATTR_TMO_VALUE, 20000);
    EXPECT_EQ(query(m_session, "*OPC?"), "1\n");
}

TEST_P(Simulator, ServesTwoThreadsOnTwoSessions)
{
    VisaSession other;
    prepare(other);
    const auto ask = [this](VisaSession &session) {
        for (int i = 0; i < 300; ++i)
            ASSERT_EQ(query(session, "*OPC?"), "1\n");
    };
    std::thread second([&] { ask(other); });
    ask(m_session);
    second.join();
}

TEST_P(Simulator, KeepsTheTransfersOfTwoThreadsOnOneSessionApart)
{
    // Each transfer is whole; which thread gets which answer is between the threads.
    const auto send = [this] {
        for (int i = 0; i < 300; ++i) {
            const std::string command = "*ESE 3;*SRE 5\n";
            ASSERT_EQ(viWrite(m_session.vi, reinterpret_cast<ViConstBuf>(command.data()),
                              static_cast<ViUInt32>(command.size()), nullptr),
                      VI_SUCCESS);
        }
    };
    std::thread second(send);
    send();
    second.join();
    EXPECT_EQ(query(m_session, "SYST:ERR?"), "0,\"No error\"\n");
}

TEST_P(Simulator, ClearGetsOutOfAnythingUnread)
{
    ASSERT_EQ(m_session.write("*IDN?\n"), VI_SUCCESS);
    EXPECT_EQ(m_session.read(2), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(viClear(m_session.vi), VI_SUCCESS);
    EXPECT_EQ(query(m_session, "*OPC?"), "1\n");
}

TEST_P(Simulator, TakesTriggerAndStatusByte)
{
    m_session.set(VI_ATTR_IO_PROT, VI_PROT_4882_STRS);
    EXPECT_EQ(query(m_session, "*CLS;*ESE 1;*SRE 32;*OPC?"), "1\n");
    EXPECT_EQ(m_session.write("*OPC\n"), VI_SUCCESS);
    EXPECT_EQ(query(m_session, "*OPC?"), "1\n");
    ViUInt16 status = 0;
    EXPECT_EQ(viReadSTB(m_session.vi, &status), VI_SUCCESS);
    EXPECT_EQ(status & 0x60, 0x60);
    EXPECT_EQ(viAssertTrigger(m_session.vi, VI_TRIG_PROT_DEFAULT), VI_SUCCESS);
    EXPECT_EQ(query(m_session, "*OPC?"), "1\n");
}

TEST_P(Simulator, EndOfTheSimulatorIsALostConnection)
{
    ASSERT_EQ(query(m_session, "*OPC?"), "1\n");
    {
        SimulatorProcess shortLived(GetParam().options);
        VisaSession session;
        ASSERT_EQ(session.open(shortLived.resource(GetParam().name)), VI_SUCCESS);
        ::kill(shortLived.id(), SIGTERM);
        session.set(VI_ATTR_TMO_VALUE, 20000);
        EXPECT_EQ(session.read(), VI_ERROR_CONN_LOST);
        EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
    }
    EXPECT_EQ(query(m_session, "*OPC?"), "1\n");
}

class SimulatorHislip : public testing::Test
{
protected:
    void SetUp() override
    {
        ASSERT_EQ(m_session.open(m_simulator.resource("hislip")), VI_SUCCESS);
        m_session.set(VI_ATTR_TMO_VALUE, 20000);
    }
    std::string query(const std::string &question)
    {
        EXPECT_EQ(m_session.write(question + "\n"), VI_SUCCESS);
        EXPECT_EQ(m_session.read(), VI_SUCCESS);
        return m_session.text;
    }

    SimulatorProcess m_simulator{{"--hislip", "0"}};
    VisaSession m_session;
};

TEST_F(SimulatorHislip, AsksForServiceWhenAnOperationIsComplete)
{
    ASSERT_EQ(viEnableEvent(m_session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, 0), VI_SUCCESS);
    ASSERT_EQ(m_session.write("*CLS;*ESE 1;*SRE 32\n"), VI_SUCCESS);
    for (int round = 0; round < 10; ++round) {
        ASSERT_EQ(m_session.write("*OPC\n"), VI_SUCCESS);
        ASSERT_EQ(viWaitOnEvent(m_session.vi, VI_EVENT_SERVICE_REQ, 20000, nullptr, nullptr), VI_SUCCESS);
        ViUInt16 status = 0;
        EXPECT_EQ(viReadSTB(m_session.vi, &status), VI_SUCCESS);
        EXPECT_EQ(status & 0x60, 0x60);
        EXPECT_EQ(viReadSTB(m_session.vi, &status), VI_SUCCESS);
        EXPECT_EQ(status & 0x60, 0x20); // the request is served, its reason is still there
        EXPECT_EQ(query("*ESR?"), "1\n");
    }
}

TEST_F(SimulatorHislip, InterruptedQueryGivesTheSecondAnswerAlone)
{
    ASSERT_EQ(m_session.write("*IDN?\n"), VI_SUCCESS);
    EXPECT_EQ(query("*OPC?"), "1\n");
    EXPECT_NE(query("SYST:ERR?").find("-410"), std::string::npos);
    EXPECT_EQ(query("SYST:ERR?"), "0,\"No error\"\n");
}

TEST_F(SimulatorHislip, ReadAnswersAreNotInterrupted)
{
    for (int i = 0; i < 100; ++i)
        ASSERT_EQ(query("*OPC?"), "1\n");
    EXPECT_EQ(query("SYST:ERR?"), "0,\"No error\"\n");
}

TEST_F(SimulatorHislip, GoesToRemoteAndBackToLocal)
{
    EXPECT_EQ(viGpibControlREN(m_session.vi, VI_GPIB_REN_ASSERT_ADDRESS_LLO), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(m_session.vi, VI_GPIB_REN_DEASSERT_GTL), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(m_session.vi, VI_GPIB_REN_ASSERT), VI_SUCCESS);
    EXPECT_EQ(query("*OPC?"), "1\n");
}

TEST_F(SimulatorHislip, RefusesAnUnknownSubAddressPromptly)
{
    std::string name = m_simulator.resource("hislip");
    name.replace(name.find("hislip0"), 7, "hislip7");
    VisaSession other;
    EXPECT_EQ(other.open(name, 30000), VI_ERROR_RSRC_NFOUND);
}

} // namespace
