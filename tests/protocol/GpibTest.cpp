// GPIB through a LAN/GPIB gateway: byte by byte against a scripted one, then against the simulator's bus.
#include "support/SimulatorProcess.h"
#include "support/TemporaryFolder.h"
#include "support/Vxi11Instrument.h"

#include <array>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <gtest/gtest.h>

using test::RpcServed;
using test::ScriptedPeer;
using test::SimulatorProcess;
using test::VisaSession;
using test::Vxi11Peer;
using test::withoutTime;

namespace
{

/// A configuration file that gives GPIB boards their gateways.
class GatewayFile
{
public:
    explicit GatewayFile(const std::string &lines)
    {
        const std::string name = m_folder.file("kyvisa.ini");
        std::ofstream(name) << "[KYGPIB-GATEWAYS]\n" << lines;
        ::setenv("KYVISA_CONFIG", name.c_str(), 1);
    }

private:
    test::TemporaryFolder m_folder;
};

constexpr const char *Board0 = "Board0 = \"TCPIP::127.0.0.1::gpib0\"\n";
constexpr const char *Link7 = "00000000 00000007 00000000 00004000";
constexpr const char *Link8 = "00000000 00000008 00000000 00004000";

/// A gateway that follows a script, and a session to it.
class Gateway
{
public:
    Gateway(const std::string &resource, const std::string &createLink, std::function<void(RpcServed &)> script,
            const std::string &configuration = Board0)
        : m_file(configuration), m_peer([createLink, script = std::move(script)](ScriptedPeer &scripted) {
              Vxi11Peer peer(scripted);
              peer.answerPort();
              RpcServed core = peer.accept();
              core.serve("000607AF 00000001 0000000A | 00000000 00000000 00000000 " + createLink, Link7);
              script(core);
              Vxi11Peer::endLink(core);
          })
    {
        test::usePortmapper(m_peer.port());
        EXPECT_EQ(session.open(resource), VI_SUCCESS);
        session.set(VI_ATTR_TMO_VALUE, 20000);
    }
    ~Gateway()
    {
        EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
        m_peer.finish();
    }
    Gateway(const Gateway &) = delete;
    Gateway &operator=(const Gateway &) = delete;

private:
    GatewayFile m_file; ///< before the session's resource manager reads it
    ScriptedPeer m_peer;

public:
    VisaSession session;
};

/// Takes a device_docmd of @p link and answers it. @p command: command, network order, element size, data
void serveCommand(RpcServed &core, const std::string &link, const std::string &command, const std::string &result)
{
    std::string call = core.takeCall();
    if (call.size() > 55)
        call.replace(47, 8, "........"); // the instrument's time
    EXPECT_EQ(call, "000607AF 00000001 00000016 | " + link + " 00000000 ........ 00000000 " + command);
    core.reply(result);
}

constexpr const char *Interface = "00000005 67706962 30000000"; // "gpib0"

} // namespace

TEST(Gpib, AnInstrumentIsADeviceOfTheBoardsGateway)
{
    Gateway gateway("GPIB0::5::INSTR", "00000007 67706962 302C3500", [](RpcServed &core) { // "gpib0,5"
        EXPECT_EQ(core.takeCall().substr(0, 26), "000607AF 00000001 0000000D");
        core.reply("00000000 00000041");
    });
    VisaSession &session = gateway.session;
    ViUInt16 status = 0;
    EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
    EXPECT_EQ(status, 0x41);
    EXPECT_EQ(session.getText(VI_ATTR_RSRC_NAME), "GPIB0::5::INSTR");
    EXPECT_EQ(session.getText(VI_ATTR_INTF_INST_NAME), "GPIB0 (127.0.0.1 gpib0)");
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_INTF_TYPE), VI_INTF_GPIB);
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_GPIB_PRIMARY_ADDR), 5);
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_GPIB_SECONDARY_ADDR), VI_NO_SEC_ADDR);
    EXPECT_EQ(session.set(VI_ATTR_GPIB_PRIMARY_ADDR, 6), VI_ERROR_ATTR_READONLY);
    EXPECT_EQ(session.set(VI_ATTR_GPIB_SECONDARY_ADDR, 6), VI_ERROR_ATTR_READONLY);
    EXPECT_EQ(session.set(VI_ATTR_GPIB_READDR_EN, VI_FALSE), VI_SUCCESS);
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_GPIB_READDR_EN), VI_FALSE);
    EXPECT_EQ(session.set(VI_ATTR_IO_PROT, VI_PROT_HS488), VI_WARN_NSUP_ATTR_STATE);
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_IO_PROT), VI_PROT_NORMAL);
    EXPECT_EQ(viGpibSendIFC(session.vi), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viGpibControlATN(session.vi, VI_GPIB_ATN_ASSERT), VI_ERROR_NSUP_OPER);
}

TEST(Gpib, SecondaryAddressesMayBeWrittenAsTheyGoOverTheBus)
{
    Gateway gateway(
        "GPIB3::9::97::INSTR", "00000009 67706962 312C392C 31000000", [](RpcServed &) {}, // "gpib1,9,1"
        "Board0=TCPIP::10.0.0.1::gpib0\nBoard3 = TCPIP::127.0.0.1::gpib1::INSTR\n");
    EXPECT_EQ(gateway.session.getText(VI_ATTR_RSRC_NAME), "GPIB3::9::1::INSTR");
    EXPECT_EQ(gateway.session.get<ViUInt16>(VI_ATTR_GPIB_SECONDARY_ADDR), 1);
}

TEST(Gpib, AGatewayMayBeNamedByItsAlias)
{
    const Gateway gateway(
        "GPIB0::9::INSTR", "00000007 67706962 312C3900", [](RpcServed &) {}, // "gpib1,9"
        "Board0 = Rack\n[ALIASES]\nAlias0 = \"'rack','TCPIP::127.0.0.1::gpib1::INSTR'\"\n");
}

TEST(Gpib, ABoardWithoutAGatewayIsNotConfigured)
{
    const GatewayFile file("Board1 = TCPIP::127.0.0.1::hislip0\nBoard2 = nonsense\nBoard3 = GPIB0::INTFC\n"
                           "Board4 = TCPIP::127.0.0.1::gpib0,5::INSTR\n");
    VisaSession session;
    for (const char *name : {"GPIB0::5::INSTR", "GPIB1::5::INSTR", "GPIB2::INTFC", "GPIB3::INTFC", "GPIB4::5::INSTR",
                             "GPIB4::INTFC", "GPIB9::1::INSTR"})
        EXPECT_EQ(session.open(name), VI_ERROR_INTF_NUM_NCONFIG) << name;
}

TEST(Gpib, TheInterfaceTakesEveryCommandOfTheBus)
{
    Gateway gateway("GPIB0::INTFC", Interface, [](RpcServed &core) {
        serveCommand(core, "00000007", "00020000 00000001 00000001 00000003 3F5F0900", "00000000 00000003 3F5F0900");
        serveCommand(core, "00000007", "00020002 00000001 00000002 00000002 00010000", "00000000 00000002 00010000");
        serveCommand(core, "00000007", "00020002 00000001 00000002 00000002 00000000", "00000000 00000002 00000000");
        serveCommand(core, "00000007", "00020003 00000001 00000002 00000002 00010000", "00000000 00000002 00010000");
        serveCommand(core, "00000007", "00020003 00000001 00000002 00000002 00000000", "00000000 00000002 00000000");
        serveCommand(core, "00000007", "00020003 00000001 00000002 00000002 00010000", "00000000 00000002 00010000");
        serveCommand(core, "00000007", "00020000 00000001 00000001 00000001 11000000", "00000000 00000001 11000000");
        serveCommand(core, "00000007", "00020004 00000001 00000004 00000004 00000006", "00000000 00000004 00000006");
        // TAG 6, MSA 2, TCT: the gateway's own command has no room for it
        serveCommand(core, "00000007", "00020000 00000001 00000001 00000003 46620900", "00000000 00000003 46620900");
        serveCommand(core, "00000007", "00020010 00000001 00000000 00000000", "00000000 00000000");
        serveCommand(core, "00000007", "0002000A 00000001 00000004 00000004 00000011", "00000000 00000004 00000011");
        EXPECT_EQ(core.takeCall().substr(0, 26), "000607AF 00000001 0000000E"); // GET for whoever listens
        core.reply("00000000");
    });
    VisaSession &session = gateway.session;
    const ViSession vi = session.vi;
    const std::array<ViByte, 3> commands = {0x3F, 0x5F, 0x09};
    ViUInt32 count = 0;
    EXPECT_EQ(viGpibCommand(vi, commands.data(), commands.size(), &count), VI_SUCCESS);
    EXPECT_EQ(count, 3u);
    EXPECT_EQ(viGpibControlATN(vi, VI_GPIB_ATN_ASSERT), VI_SUCCESS);
    EXPECT_EQ(viGpibControlATN(vi, VI_GPIB_ATN_DEASSERT), VI_SUCCESS);
    EXPECT_EQ(viGpibControlATN(vi, VI_GPIB_ATN_DEASSERT_HANDSHAKE), VI_ERROR_NSUP_MODE);
    EXPECT_EQ(viGpibControlATN(vi, VI_GPIB_ATN_ASSERT_IMMEDIATE), VI_ERROR_NSUP_MODE);
    EXPECT_EQ(viGpibControlATN(vi, 4), VI_ERROR_INV_MODE);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_ASSERT), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_DEASSERT), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_ASSERT_LLO), VI_SUCCESS);
    for (const ViUInt16 addressed : {2, 3, 5, 6})
        EXPECT_EQ(viGpibControlREN(vi, addressed), VI_ERROR_INV_MODE) << addressed;
    EXPECT_EQ(viGpibPassControl(vi, 6, VI_NO_SEC_ADDR), VI_SUCCESS);
    EXPECT_EQ(viGpibPassControl(vi, 6, 2), VI_SUCCESS);
    EXPECT_EQ(viGpibPassControl(vi, 31, VI_NO_SEC_ADDR), VI_ERROR_INV_PARAMETER);
    EXPECT_EQ(viGpibPassControl(vi, 6, 31), VI_ERROR_INV_PARAMETER);
    EXPECT_EQ(viGpibSendIFC(vi), VI_SUCCESS);
    EXPECT_EQ(session.set(VI_ATTR_GPIB_PRIMARY_ADDR, 17), VI_SUCCESS);
    EXPECT_EQ(session.set(VI_ATTR_GPIB_PRIMARY_ADDR, 31), VI_ERROR_NSUP_ATTR_STATE);
    EXPECT_EQ(viAssertTrigger(vi, VI_TRIG_PROT_DEFAULT), VI_SUCCESS);
    // Of an instrument, not of an interface.
    EXPECT_EQ(viClear(vi), VI_ERROR_NSUP_OPER);
    ViUInt16 status = 0;
    EXPECT_EQ(viReadSTB(vi, &status), VI_ERROR_NSUP_OPER);
}

TEST(Gpib, TheTimeForACommandIsWhatIsLeftOfTheCallers)
{
    std::uint32_t first = 0;
    std::uint32_t second = 0;
    {
        Gateway gateway("GPIB0::INTFC", Interface, [&](RpcServed &core) {
            withoutTime(core.takeCall(), 2, &first);
            core.reply("00000000 00000000");
            withoutTime(core.takeCall(), 2, &second);
            core.reply("00000000 00000000");
        });
        gateway.session.set(VI_ATTR_TMO_VALUE, 7000);
        EXPECT_EQ(viGpibSendIFC(gateway.session.vi), VI_SUCCESS);
        gateway.session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
        EXPECT_EQ(viGpibSendIFC(gateway.session.vi), VI_SUCCESS);
    }
    EXPECT_GT(first, 0u);
    EXPECT_LE(first, 7000u);
    EXPECT_EQ(second, 0x7FFFFFFFu);
}

TEST(Gpib, LongCommandsGoOutInPiecesThatTheGatewayTakes)
{
    Gateway gateway("GPIB0::INTFC", Interface, [](RpcServed &core) {
        for (const char *size : {"00000080", "00000080", "0000002C"}) {
            const std::string call = core.takeCall();
            EXPECT_EQ(call.substr(92, 8), size);
            core.reply("00000000 00000000");
        }
        core.takeCall();
        core.reply("00000000 00000000");
        core.takeCall();
        core.reply("0000000F 00000000");
    });
    const std::array<ViByte, 300> commands{};
    ViUInt32 count = 0;
    EXPECT_EQ(viGpibCommand(gateway.session.vi, commands.data(), 300, &count), VI_SUCCESS);
    EXPECT_EQ(count, 300u);
    EXPECT_EQ(viGpibCommand(gateway.session.vi, commands.data(), 300, &count), VI_ERROR_TMO);
    EXPECT_EQ(count, 128u);
    EXPECT_EQ(viGpibCommand(gateway.session.vi, nullptr, 0, &count), VI_SUCCESS);
    EXPECT_EQ(viGpibCommand(gateway.session.vi, nullptr, 1, &count), VI_ERROR_USER_BUF);
}

TEST(Gpib, TheStateOfTheBusIsAskedForEachTime)
{
    Gateway gateway("GPIB0::INTFC", Interface, [](RpcServed &core) {
        const auto answer = [&](const char *question, const char *value) {
            serveCommand(core, "00000007", std::string("00020001 00000001 00000002 00000002 ") + question + "0000",
                         std::string("00000000 00000002 ") + value + "0000");
        };
        answer("0001", "0001"); // REN
        answer("0001", "0000");
        answer("0002", "0001"); // SRQ
        answer("0003", "0001"); // NDAC
        answer("0004", "0001"); // system controller
        answer("0005", "0000"); // controller in charge
        answer("0006", "0000"); // talker, listener
        answer("0007", "0001");
        answer("0006", "0001");
        answer("0007", "0000");
        answer("0008", "0015"); // address
    });
    VisaSession &session = gateway.session;
    EXPECT_EQ(session.get<ViInt16>(VI_ATTR_GPIB_REN_STATE), VI_STATE_ASSERTED);
    EXPECT_EQ(session.get<ViInt16>(VI_ATTR_GPIB_REN_STATE), VI_STATE_UNASSERTED);
    EXPECT_EQ(session.get<ViInt16>(VI_ATTR_GPIB_SRQ_STATE), VI_STATE_ASSERTED);
    EXPECT_EQ(session.get<ViInt16>(VI_ATTR_GPIB_NDAC_STATE), VI_STATE_ASSERTED);
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_GPIB_SYS_CNTRL_STATE), VI_TRUE);
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_GPIB_CIC_STATE), VI_FALSE);
    EXPECT_EQ(session.get<ViInt16>(VI_ATTR_GPIB_ADDR_STATE), VI_GPIB_LISTENER);
    EXPECT_EQ(session.get<ViInt16>(VI_ATTR_GPIB_ADDR_STATE), VI_GPIB_TALKER);
    EXPECT_EQ(session.get<ViUInt16>(VI_ATTR_GPIB_PRIMARY_ADDR), 21);
    EXPECT_EQ(session.get<ViInt16>(VI_ATTR_GPIB_ATN_STATE), VI_STATE_UNKNOWN) << "the gateway has no such question";
    EXPECT_EQ(session.get<ViInt16>(VI_ATTR_GPIB_HS488_CBL_LEN), VI_GPIB_HS488_NIMPL);
    EXPECT_EQ(session.set(VI_ATTR_GPIB_HS488_CBL_LEN, 5), VI_ERROR_NSUP_ATTR_STATE);
    EXPECT_EQ(session.set(VI_ATTR_GPIB_SECONDARY_ADDR, 5), VI_ERROR_NSUP_ATTR_STATE);
    EXPECT_EQ(session.set(VI_ATTR_GPIB_SECONDARY_ADDR, VI_NO_SEC_ADDR), VI_SUCCESS);
    EXPECT_EQ(session.set(VI_ATTR_DEV_STATUS_BYTE, 5), VI_ERROR_NSUP_ATTR_STATE);
    EXPECT_EQ(session.set(VI_ATTR_DEV_STATUS_BYTE, 0), VI_SUCCESS);
}

TEST(Gpib, AGatewayThatTakesNoCommandsSaysSo)
{
    Gateway gateway("GPIB0::INTFC", Interface, [](RpcServed &core) {
        for (int i = 0; i < 8; ++i) {
            EXPECT_EQ(core.takeCall().substr(0, 26), "000607AF 00000001 00000016");
            core.reply("00000008 00000000");
        }
    });
    VisaSession &session = gateway.session;
    const ViSession vi = session.vi;
    const ViByte command = 0x3F;
    EXPECT_EQ(viGpibSendIFC(vi), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viGpibControlATN(vi, VI_GPIB_ATN_ASSERT), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_ASSERT), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viGpibCommand(vi, &command, 1, nullptr), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(viGpibPassControl(vi, 3, VI_NO_SEC_ADDR), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(session.get<ViInt16>(VI_ATTR_GPIB_REN_STATE), VI_STATE_UNKNOWN);
    ViUInt16 value = 0;
    EXPECT_EQ(viGetAttribute(vi, VI_ATTR_GPIB_CIC_STATE, &value), VI_ERROR_NSUP_ATTR);
    EXPECT_EQ(session.set(VI_ATTR_GPIB_PRIMARY_ADDR, 4), VI_ERROR_NSUP_ATTR_STATE);
}

TEST(Gpib, AnAnswerToACommandThatHasNoEndIsALostConnection)
{
    const GatewayFile file(Board0);
    ScriptedPeer peer([](ScriptedPeer &scripted) {
        Vxi11Peer gateway(scripted);
        gateway.answerPort();
        RpcServed core = gateway.accept();
        core.takeCall();
        core.reply(Link7);
        core.takeCall();
        std::string endless = core.record("00000000 7FFFFF00");
        endless.replace(0, 4, test::hex("FFFFFFFF"));
        core.connection.send(endless);
        core.connection.expectClosed();
    });
    test::usePortmapper(peer.port());
    VisaSession session;
    ASSERT_EQ(session.open("GPIB0::INTFC"), VI_SUCCESS);
    EXPECT_EQ(viGpibSendIFC(session.vi), VI_ERROR_CONN_LOST);
    EXPECT_EQ(viGpibSendIFC(session.vi), VI_ERROR_CONN_LOST);
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
}

TEST(Gpib, ACommandThatFailsBecauseAnotherIsInChargeSaysSo)
{
    Gateway gateway("GPIB0::INTFC", Interface, [](RpcServed &core) {
        const auto fail = [&](const char *question, const char *answer) {
            core.takeCall();
            core.reply("00000011 00000000");
            EXPECT_EQ(core.takeCall().substr(101, 4), question);
            core.reply(std::string("00000000 00000002 ") + answer + "0000");
        };
        fail("0005", "0000");
        fail("0005", "0001");
        fail("0004", "0000");
    });
    const ViSession vi = gateway.session.vi;
    EXPECT_EQ(viGpibControlATN(vi, VI_GPIB_ATN_ASSERT), VI_ERROR_NCIC);
    EXPECT_EQ(viGpibControlATN(vi, VI_GPIB_ATN_ASSERT), VI_ERROR_IO);
    EXPECT_EQ(viGpibSendIFC(vi), VI_ERROR_NSYS_CNTLR);
}

TEST(Gpib, AnInstrumentSessionReachesTheBusOnTheSameConnectionAndLetsGoOfIt)
{
    Gateway gateway("GPIB0::5::INSTR", "00000007 67706962 302C3500", [](RpcServed &core) {
        core.serve(std::string("000607AF 00000001 0000000A | 00000000 00000000 00000000 ") + Interface, Link8);
        serveCommand(core, "00000008", "00020003 00000001 00000002 00000002 00010000", "00000000 00000002 00010000");
        // All seven modes: the instrument's part on its link, the bus' part on the interface's.
        serveCommand(core, "00000008", "00020003 00000001 00000002 00000002 00000000", "00000000 00000002 00000000");
        const auto generic = [&](const char *procedure) {
            EXPECT_EQ(core.takeCall().substr(0, 37), std::string("000607AF 00000001 ") + procedure + " | 00000007");
            core.reply("00000000");
        };
        generic("00000011");
        serveCommand(core, "00000008", "00020003 00000001 00000002 00000002 00000000", "00000000 00000002 00000000");
        generic("00000010");
        serveCommand(core, "00000008", "00020003 00000001 00000002 00000002 00010000", "00000000 00000002 00010000");
        serveCommand(core, "00000008", "00020000 00000001 00000001 00000001 11000000", "00000000 00000001 11000000");
        generic("00000010");
        serveCommand(core, "00000008", "00020000 00000001 00000001 00000001 11000000", "00000000 00000001 11000000");
        generic("00000011");
        core.serve("000607AF 00000001 00000017 | 00000008", "00000000");
    });
    const ViSession vi = gateway.session.vi;
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_ASSERT), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_DEASSERT), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_DEASSERT_GTL), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_ASSERT_ADDRESS), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_ASSERT_LLO), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_ASSERT_ADDRESS_LLO), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(vi, VI_GPIB_REN_ADDRESS_GTL), VI_SUCCESS);
}

TEST(Gpib, WhatEndsATransferReachesTheGateway)
{
    for (const bool interface : {false, true}) {
        Gateway gateway(interface ? "GPIB0::INTFC" : "GPIB0::5::INSTR",
                        interface ? Interface : "00000007 67706962 302C3500", [](RpcServed &core) {
                            const auto write = [&](const char *flags) {
                                EXPECT_EQ(withoutTime(core.takeCall(), 1),
                                          std::string("000607AF 00000001 0000000B | 00000007 ........ 00000000 ") +
                                              flags + " 00000001 3F000000");
                                core.reply("00000000 00000001");
                            };
                            const auto read = [&](const char *size, const char *flags, const char *reason) {
                                EXPECT_EQ(withoutTime(core.takeCall(), 2),
                                          std::string("000607AF 00000001 0000000C | 00000007 ") + size +
                                              " ........ 00000000 " + flags);
                                core.reply(std::string("00000000 ") + reason + " 00000001", ";");
                            };
                            write("00000008");
                            write("00000000");
                            read("00000002", "00000080 0000003B", "00000002");
                            read("00000002", "00000000 00000000", "00000004");
                            read("00000002", "00000000 00000000", "00000004");
                            read("00000001", "00000000 00000000", "00000001");
                        });
        VisaSession &session = gateway.session;
        EXPECT_EQ(session.write("?"), VI_SUCCESS);
        EXPECT_EQ(session.set(VI_ATTR_SEND_END_EN, VI_FALSE), VI_SUCCESS);
        EXPECT_EQ(session.write("?"), VI_SUCCESS);
        EXPECT_EQ(session.set(VI_ATTR_TERMCHAR, ';'), VI_SUCCESS);
        EXPECT_EQ(session.set(VI_ATTR_TERMCHAR_EN, VI_TRUE), VI_SUCCESS);
        EXPECT_EQ(session.read(2), VI_SUCCESS_TERM_CHAR);
        EXPECT_EQ(session.set(VI_ATTR_TERMCHAR_EN, VI_FALSE), VI_SUCCESS);
        EXPECT_EQ(session.read(2), VI_SUCCESS);
        if (interface) { // it has no such attribute
            EXPECT_EQ(session.set(VI_ATTR_SUPPRESS_END_EN, VI_TRUE), VI_ERROR_NSUP_ATTR);
            EXPECT_EQ(session.read(2), VI_SUCCESS);
            EXPECT_EQ(session.read(1), VI_SUCCESS_MAX_CNT);
        } else {
            EXPECT_EQ(session.set(VI_ATTR_SUPPRESS_END_EN, VI_TRUE), VI_SUCCESS);
            EXPECT_EQ(session.read(2), VI_SUCCESS_MAX_CNT);
        }
    }
}

TEST(Gpib, UnaddressingFollowsEachTransfer)
{
    Gateway gateway("GPIB0::5::INSTR", "00000007 67706962 302C3500", [](RpcServed &core) {
        core.serve(std::string("000607AF 00000001 0000000A | 00000000 00000000 00000000 ") + Interface, Link8);
        serveCommand(core, "00000008", "00020001 00000001 00000002 00000002 00050000", "00000000 00000002 00010000");
        EXPECT_EQ(core.takeCall().substr(0, 26), "000607AF 00000001 0000000B");
        core.reply("00000000 00000001");
        serveCommand(core, "00000008", "00020000 00000001 00000001 00000002 3F5F0000", "00000000 00000002 3F5F0000");
        EXPECT_EQ(core.takeCall().substr(0, 26), "000607AF 00000001 0000000C");
        core.reply("00000000 00000004 00000001", "x");
        serveCommand(core, "00000008", "00020000 00000001 00000001 00000002 3F5F0000", "00000000 00000002 3F5F0000");
        EXPECT_EQ(core.takeCall().substr(0, 26), "000607AF 00000001 0000000B");
        core.reply("00000000 00000001");
        core.serve("000607AF 00000001 00000017 | 00000008", "00000000");
    });
    VisaSession &session = gateway.session;
    EXPECT_EQ(session.set(VI_ATTR_GPIB_UNADDR_EN, VI_TRUE), VI_SUCCESS);
    EXPECT_EQ(session.write("?"), VI_SUCCESS);
    EXPECT_EQ(session.read(), VI_SUCCESS);
    EXPECT_EQ(session.set(VI_ATTR_GPIB_UNADDR_EN, VI_FALSE), VI_SUCCESS);
    EXPECT_EQ(session.write("?"), VI_SUCCESS);
}

namespace
{

class GpibSimulator : public testing::Test
{
protected:
    explicit GpibSimulator(const char *option = "--gpib") : m_simulator({"--vxi11", "0", "--portmapper", "0", option})
    {
        test::usePortmapper(static_cast<std::uint16_t>(std::stoi(m_simulator.resource("portmapper"))));
    }
    void open(VisaSession &session, const std::string &name)
    {
        ASSERT_EQ(session.open(name), VI_SUCCESS) << name;
        session.set(VI_ATTR_TMO_VALUE, 20000);
    }
    static std::string query(VisaSession &session, const std::string &question)
    {
        EXPECT_EQ(session.write(question + "\n"), VI_SUCCESS);
        EXPECT_EQ(session.read(), VI_SUCCESS);
        return session.text;
    }

    GatewayFile m_file{Board0};
    SimulatorProcess m_simulator;
};

class GpibSimulatorWithoutCommands : public GpibSimulator
{
protected:
    GpibSimulatorWithoutCommands() : GpibSimulator("--gpib-refuse-docmd") {}
};

} // namespace

TEST_F(GpibSimulator, InstrumentsAreReachedByBoardAndByGateway)
{
    VisaSession board;
    VisaSession lan;
    VisaSession second;
    open(board, "GPIB0::5::INSTR");
    open(lan, m_simulator.resource("gpib"));
    open(second, "GPIB0::9::1::INSTR");
    EXPECT_EQ(query(board, "*ESE 17;*ESE?"), "17\n");
    EXPECT_EQ(query(lan, "*ESE?"), "17\n") << "one instrument by two names";
    EXPECT_EQ(query(second, "*ESE?"), "0\n") << "another one";
    EXPECT_EQ(lan.getText(VI_ATTR_RSRC_NAME), "TCPIP0::127.0.0.1::gpib0,5::INSTR");
}

TEST_F(GpibSimulator, NobodyAtAnAddressIsATimeOut)
{
    VisaSession session;
    open(session, "GPIB0::17::INSTR");
    session.set(VI_ATTR_TMO_VALUE, 100);
    const ViStatus status = session.write("*IDN?\n");
    EXPECT_TRUE(status == VI_ERROR_TMO || status == VI_ERROR_IO) << status;
    EXPECT_EQ(session.count, 0u);
}

TEST_F(GpibSimulator, ServiceRequestsOfTheBusReachTheSession)
{
    VisaSession session;
    open(session, "GPIB0::7::INSTR");
    ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, VI_NULL), VI_SUCCESS);
    ASSERT_EQ(session.write("*CLS;*ESE 1;*SRE 32\n"), VI_SUCCESS);
    for (int round = 0; round < 3; ++round) {
        ASSERT_EQ(session.write("*OPC\n"), VI_SUCCESS);
        ASSERT_EQ(viWaitOnEvent(session.vi, VI_EVENT_SERVICE_REQ, 20000, nullptr, nullptr), VI_SUCCESS);
        ViUInt16 status = 0;
        EXPECT_EQ(viReadSTB(session.vi, &status), VI_SUCCESS);
        EXPECT_EQ(status & 0x60, 0x60);
        EXPECT_EQ(query(session, "*ESR?"), "1\n");
    }
}

TEST_F(GpibSimulator, TheBusIsControlledByHand)
{
    VisaSession bus;
    open(bus, "GPIB0::INTFC");
    EXPECT_EQ(viGpibSendIFC(bus.vi), VI_SUCCESS);
    EXPECT_EQ(bus.get<ViUInt16>(VI_ATTR_GPIB_CIC_STATE), VI_TRUE);
    EXPECT_EQ(bus.get<ViUInt16>(VI_ATTR_GPIB_PRIMARY_ADDR), 21);
    EXPECT_EQ(viGpibControlREN(bus.vi, VI_GPIB_REN_ASSERT), VI_SUCCESS);
    EXPECT_EQ(bus.get<ViInt16>(VI_ATTR_GPIB_REN_STATE), VI_STATE_ASSERTED);
    // Listen address 5, talk address of the interface, data, then the other way round.
    const std::array<ViByte, 3> listen = {0x3F, 0x40 + 21, 0x20 + 5};
    EXPECT_EQ(viGpibCommand(bus.vi, listen.data(), 3, nullptr), VI_SUCCESS);
    EXPECT_EQ(bus.get<ViInt16>(VI_ATTR_GPIB_ADDR_STATE), VI_GPIB_TALKER);
    EXPECT_EQ(bus.write("*ESE 5;*ESE?\n"), VI_SUCCESS);
    const std::array<ViByte, 3> talk = {0x3F, 0x40 + 5, 0x20 + 21};
    EXPECT_EQ(viGpibCommand(bus.vi, talk.data(), 3, nullptr), VI_SUCCESS);
    EXPECT_EQ(bus.get<ViInt16>(VI_ATTR_GPIB_ADDR_STATE), VI_GPIB_LISTENER);
    EXPECT_EQ(bus.read(), VI_SUCCESS);
    EXPECT_EQ(bus.text, "5\n");
    EXPECT_EQ(viGpibPassControl(bus.vi, 5, VI_NO_SEC_ADDR), VI_SUCCESS);
    EXPECT_EQ(bus.get<ViUInt16>(VI_ATTR_GPIB_CIC_STATE), VI_FALSE);
    EXPECT_EQ(viGpibCommand(bus.vi, talk.data(), 3, nullptr), VI_ERROR_NCIC);
    EXPECT_EQ(viGpibSendIFC(bus.vi), VI_SUCCESS);
    EXPECT_EQ(bus.get<ViUInt16>(VI_ATTR_GPIB_CIC_STATE), VI_TRUE);
}

TEST_F(GpibSimulatorWithoutCommands, InstrumentsWorkAndTheBusIsOutOfReach)
{
    VisaSession session;
    open(session, "GPIB0::5::INSTR");
    EXPECT_EQ(query(session, "*OPC?"), "1\n");
    EXPECT_EQ(viGpibControlREN(session.vi, VI_GPIB_REN_ASSERT_ADDRESS), VI_SUCCESS);
    EXPECT_EQ(viGpibControlREN(session.vi, VI_GPIB_REN_ASSERT), VI_ERROR_NSUP_OPER);
    EXPECT_EQ(session.get<ViInt16>(VI_ATTR_GPIB_REN_STATE), VI_STATE_UNKNOWN);
    EXPECT_EQ(session.set(VI_ATTR_GPIB_UNADDR_EN, VI_TRUE), VI_ERROR_NSUP_ATTR_STATE);
    EXPECT_EQ(query(session, "*OPC?"), "1\n");
}
