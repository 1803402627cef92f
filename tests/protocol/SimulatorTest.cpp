// libkyvisa.so against KyVisaSimulator: what holds over every protocol, then what each has of its own.
#include "support/SimulatorProcess.h"
#include "support/VisaSession.h"

#include <algorithm>
#include <atomic>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <filesystem>
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

void usePortmapperOf(const SimulatorProcess &simulator)
{
    ::setenv("KYVISA_PORTMAPPER_PORT", simulator.resource("portmapper").c_str(), 1);
}

class Simulator : public testing::TestWithParam<Service>
{
protected:
    void SetUp() override { prepare(m_session); }

    void prepare(VisaSession &session)
    {
        usePortmapperOf(m_simulator);
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

std::string nameOf(const testing::TestParamInfo<Service> &service)
{
    return service.param.name;
}

INSTANTIATE_TEST_SUITE_P(All, Simulator,
                         testing::Values(Service{"hislip", {"--hislip", "0"}}, Service{"socket", {"--socket", "0"}},
                                         Service{"vxi11", {"--vxi11", "0", "--portmapper", "0"}}),
                         nameOf);

/// Each client has an output queue of its own. All VXI-11 links to one instrument share one.
class SimulatorQueues : public Simulator
{
};

INSTANTIATE_TEST_SUITE_P(All, SimulatorQueues,
                         testing::Values(Service{"hislip", {"--hislip", "0"}}, Service{"socket", {"--socket", "0"}}),
                         nameOf);

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

TEST_P(SimulatorQueues, ServesTwoThreadsOnTwoSessions)
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
        usePortmapperOf(shortLived);
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

class SimulatorVxi11 : public testing::Test
{
protected:
    SimulatorVxi11() { usePortmapperOf(m_simulator); }
    static std::size_t openDescriptors()
    {
        const std::filesystem::directory_iterator entries("/proc/self/fd");
        return static_cast<std::size_t>(std::distance(begin(entries), end(entries)));
    }

    SimulatorProcess m_simulator{{"--vxi11", "0", "--portmapper", "0"}};
    const std::string m_name = m_simulator.resource("vxi11");
};

// 5. After a couple of hundred open and close cycles nothing opened any more. The simulator has room for 64 clients.
TEST_F(SimulatorVxi11, TwoThousandSessionsLeaveNeitherLinksNorDescriptorsBehind)
{
    VisaSession session;
    ASSERT_EQ(session.open(m_name), VI_SUCCESS);
    ASSERT_EQ(viClose(session.vi), VI_SUCCESS);
    const std::size_t before = openDescriptors();
    for (int i = 0; i < 2000; ++i) {
        ASSERT_EQ(session.open(m_name, 20000), VI_SUCCESS) << i;
        if (i % 10 == 0) {
            ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, VI_NULL), VI_SUCCESS) << i;
        }
        if (i % 10 == 1) {
            session.set(VI_ATTR_TMO_VALUE, 1);
            ASSERT_EQ(session.read(), VI_ERROR_TMO) << i;
        }
        ASSERT_EQ(viClose(session.vi), VI_SUCCESS) << i;
        if (i % 10 == 2) {
            ASSERT_EQ(session.open("TCPIP::127.0.0.1::inst7::INSTR", 20000), VI_ERROR_RSRC_NFOUND) << i;
        }
    }
    EXPECT_EQ(openDescriptors(), before);
}

TEST_F(SimulatorVxi11, AsksForServiceWhenAnOperationIsComplete)
{
    VisaSession session;
    ASSERT_EQ(session.open(m_name), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, 20000);
    ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, VI_NULL), VI_SUCCESS);
    ASSERT_EQ(session.write("*CLS;*ESE 1;*SRE 32\n"), VI_SUCCESS);
    for (int round = 0; round < 10; ++round) {
        ASSERT_EQ(session.write("*OPC\n"), VI_SUCCESS);
        ASSERT_EQ(viWaitOnEvent(session.vi, VI_EVENT_SERVICE_REQ, 20000, nullptr, nullptr), VI_SUCCESS);
        ViUInt16 status = 0;
        EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
        EXPECT_EQ(status & 0x60, 0x60);
        ASSERT_EQ(session.write("*ESR?\n"), VI_SUCCESS);
        EXPECT_EQ(session.read(), VI_SUCCESS);
        EXPECT_EQ(session.text, "1\n");
    }
}

TEST_F(SimulatorVxi11, TerminateEndsAReadAndTheNextQueryIsAnswered)
{
    VisaSession session;
    ASSERT_EQ(session.open(m_name), VI_SUCCESS);
    session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    for (int round = 0; round < 5; ++round) {
        std::atomic<bool> ended{false};
        std::thread other([&] {
            while (!ended) {
                viTerminate(session.vi, VI_NULL, VI_NULL);
                std::this_thread::sleep_for(std::chrono::milliseconds(5));
            }
        });
        EXPECT_EQ(session.read(), VI_ERROR_ABORT);
        ended = true;
        other.join();
        session.set(VI_ATTR_TMO_VALUE, 20000);
        ASSERT_EQ(session.write("*OPC?\n"), VI_SUCCESS);
        EXPECT_EQ(session.read(), VI_SUCCESS);
        EXPECT_EQ(session.text, "1\n");
        session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    }
}

TEST_F(SimulatorVxi11, AnExclusiveLockShutsOutOthersInTheInstrument)
{
    VisaSession holder;
    ASSERT_EQ(holder.open(m_name), VI_SUCCESS);
    ASSERT_EQ(viLock(holder.vi, VI_EXCLUSIVE_LOCK, 20000, VI_NULL, VI_NULL), VI_SUCCESS);
    VisaSession other;
    // By another name it is another resource to this machine, and the same one to the instrument.
    ASSERT_EQ(other.open("TCPIP::localhost::inst0::INSTR"), VI_SUCCESS);
    EXPECT_EQ(other.write("*CLS\n"), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(viLock(other.vi, VI_EXCLUSIVE_LOCK, VI_TMO_IMMEDIATE, VI_NULL, VI_NULL), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(viLock(other.vi, VI_EXCLUSIVE_LOCK, 50, VI_NULL, VI_NULL), VI_ERROR_TMO);
    std::thread release([&] {
        std::this_thread::sleep_for(std::chrono::milliseconds(100));
        EXPECT_EQ(viUnlock(holder.vi), VI_SUCCESS);
    });
    EXPECT_EQ(viLock(other.vi, VI_EXCLUSIVE_LOCK, 20000, VI_NULL, VI_NULL), VI_SUCCESS);
    release.join();
    EXPECT_EQ(other.write("*CLS\n"), VI_SUCCESS);
    EXPECT_EQ(holder.write("*CLS\n"), VI_ERROR_RSRC_LOCKED);
    EXPECT_EQ(viClose(other.vi), VI_SUCCESS) << "which gives the lock back";
    EXPECT_EQ(holder.write("*CLS\n"), VI_SUCCESS);
}

TEST_F(SimulatorVxi11, ANameWithoutDeviceFindsIt)
{
    VisaSession session;
    ASSERT_EQ(session.open("TCPIP::localhost::INSTR"), VI_SUCCESS);
    EXPECT_EQ(session.getText(VI_ATTR_RSRC_NAME), "TCPIP0::localhost::inst0::INSTR");
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_TCPIP_IS_HISLIP), VI_FALSE);
}

} // namespace
