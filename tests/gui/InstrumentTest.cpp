// The whole stack: the window, libkyvisa.so, a socket, the simulated instrument.

#include "gui/support/InstrumentWindowTest.h"

#include "app/MainWindow.h"
#include "support/ScriptedPeer.h"

#include <QElapsedTimer>

#include <csignal>

namespace
{

class Instrument : public InstrumentWindowTest
{
protected:
    Instrument() : InstrumentWindowTest({"--hislip", "0", "--socket", "0"}) {}
};

TEST_F(Instrument, AnswersItsIdentificationOverHislip)
{
    EXPECT_TRUE(
        eventually([this] { return window().windowTitle() == "KyVisaTester 5.8.6 Visa from Oltrava (5.8.6)"; }));
    connectTo(resource("hislip"));
    enter("basicCommand", "*IDN?\\n");
    press("basicQuery");
    EXPECT_TRUE(eventually([this] { return view().startsWith("Oltrava,KyVisaSimulator,") && view().endsWith('\n'); }))
        << view().toStdString();
    EXPECT_TRUE(eventually([this] { return logHolds(",buf= \"*IDN?\\n\",cnt= 6,retCnt= 6)"); }));
    EXPECT_TRUE(eventually([this] { return logHolds(",buf= \"Oltrava,KyVisaSimulator,"); }));
}

TEST_F(Instrument, AnswersOverARawSocket)
{
    connectTo(resource("socket"));
    // Without an END a read on a socket ends by its count.
    enterNumber("basicReadCount", 2);
    query("*OPC?\\n", "1\n");
    // A read that its count ended is no failure: the completion code stands in the log alone.
    EXPECT_TRUE(eventually([this] { return text("statusLabel") == "Status: VI_SUCCESS"; }));
    EXPECT_TRUE(eventually([this] { return logCell(logRows() - 1, 2) == "VI_SUCCESS_MAX_CNT"; }));
}

TEST_F(Instrument, TakesTheCommandByteForByte)
{
    connectTo(resource("hislip"));
    write("SOUR:VOLT \\x31.5\\n");
    query("SOUR:VOLT?\\n", "1.500000E+00\n");
    write("*ESE \\0004\\n"); // backslash and 0 vanish: *ESE 004
    query("*ESE?\\n", "4\n");
}

TEST_F(Instrument, ShowsAnErrorInTheStatusByteAndTheErrorQueue)
{
    connectTo(resource("hislip"));
    EXPECT_TRUE(statusByte("0x0"));
    write("NOSUCH:HEADER\\n");
    EXPECT_TRUE(statusByte("0x4"));
    query(":syst:err?\\n", "-113,\"Undefined header;NOSUCH:HEADER\"\n");
    EXPECT_TRUE(statusByte("0x0"));
}

TEST_F(Instrument, ForgetsAnUnreadAnswerOnClear)
{
    connectTo(resource("hislip"));
    write("*IDN?\\n");
    EXPECT_TRUE(statusByte("0x10"));
    press("basicClear");
    EXPECT_TRUE(eventually([this] { return text("statusLabel") == "Status: VI_SUCCESS"; }));
    EXPECT_TRUE(statusByte("0x0"));
    query("*OPC?\\n", "1\n");
}

TEST_F(Instrument, AReadWithoutAnAnswerEndsInItsTimeOutAndTheNextQueryIsRight)
{
    connectTo(resource("hislip"));
    press("basicRead");
    EXPECT_TRUE(eventually([this] { return text("statusLabel") == "Status: VI_ERROR_TMO"; }));
    query("*OPC?\\n", "1\n");
}

TEST_F(Instrument, ThatGoesAwayBringsTheFrameBackAndAnotherOneConnects)
{
    connectTo(resource("hislip"));
    ASSERT_EQ(::kill(simulator(), SIGKILL), 0);
    press("basicReadStb");
    EXPECT_TRUE(eventually([this] { return isVisible("resourceConnect"); })) << text("statusLabel").toStdString();
    startSimulator();
    connectTo(resource("hislip"));
    query("*OPC?\\n", "1\n");
}

TEST_F(Instrument, ThatIsNotThereFailsSoonAndTheNextConnectWorks)
{
    enter("resourceName", "TCPIP::127.0.0.1::hislip0,1::INSTR"); // nobody listens on port 1
    press("resourceConnect");
    EXPECT_TRUE(eventually([this] { return text("statusLabel") == "Status: VI_ERROR_RSRC_NFOUND"; }))
        << text("statusLabel").toStdString();
    EXPECT_TRUE(isVisible("resourceConnect"));
    connectTo(resource("hislip"));
}

TEST_F(Instrument, KeepsItsSettingsForBothProtocols)
{
    connectTo(resource("hislip"));
    write("SOUR:VOLT 2.25\\n");
    press("resourceDisconnect");
    ASSERT_TRUE(eventually([this] { return isVisible("resourceConnect"); }));
    press("logClear");
    connectTo(resource("socket"));
    enterNumber("basicReadCount", 13);
    query("SOUR:VOLT?\\n", "2.250000E+00\n");
}

/// What a peer does that means no good, and where in the conversation.
struct Misbehaviour {
    const char *name;
    test::ScriptedPeer::Script script;
};

void PrintTo(const Misbehaviour &misbehaviour, std::ostream *out)
{
    *out << misbehaviour.name;
}

/// Takes the client's first message: a header and the sub-address "hislip0".
test::PeerConnection greeted(test::ScriptedPeer &peer)
{
    auto client = peer.accept();
    client.take(16 + 7);
    return client;
}

/// Waits for the client's FatalError message and for its end.
void expectFatalErrorAndClose(test::PeerConnection &client)
{
    const std::string header = client.take(16);
    EXPECT_EQ(header.substr(0, 3), "HS\x02");
    client.take(static_cast<unsigned char>(header[15]));
    client.expectClosed();
}

std::string initializeResponse()
{
    return test::hex("4853 01 00 01000001 0000000000000000");
}

TEST_F(Instrument, ThatCutsTheLineInTheMiddleOfABlockIsClosed)
{
    {
        test::ScriptedPeer cutting([](test::ScriptedPeer &peer) {
            auto client = peer.accept();
            client.expect("CURV?\n");
            client.send("#41000" + std::string(300, 'x'));
            client.close();
        });
        connectTo("TCPIP::127.0.0.1::" + QString::number(cutting.port()) + "::SOCKET");
        enterNumber("basicReadCount", 1006);
        enter("basicCommand", "CURV?\\n");
        press("basicQuery");
        EXPECT_TRUE(eventually([this] { return isVisible("resourceConnect"); })) << text("statusLabel").toStdString();
    }
    connectTo(resource("hislip"));
    query("*OPC?\\n", "1\n");
}

class HostilePeer : public Instrument, public ::testing::WithParamInterface<Misbehaviour>
{
};

TEST_P(HostilePeer, CostsTheCallItsTimeOutAtMostAndTheWindowNothing)
{
    QElapsedTimer timer;
    timer.start();
    {
        test::ScriptedPeer peer(GetParam().script);
        enter("resourceName", "TCPIP::127.0.0.1::hislip0," + QString::number(peer.port()) + "::INSTR");
        press("resourceConnect");
        EXPECT_TRUE(eventually([this] { return text("statusLabel").startsWith("Status: VI_ERROR_"); }, 20000))
            << text("statusLabel").toStdString();
        EXPECT_TRUE(isVisible("resourceConnect"));
        enter("resourceName", "typed meanwhile"); // the window lives
        EXPECT_EQ(text("resourceName"), "typed meanwhile");
    }
    EXPECT_LT(timer.elapsed(), 20000);
    connectTo(resource("hislip"));
    query("*OPC?\\n", "1\n");
}

INSTANTIATE_TEST_SUITE_P(
    AtConnecting, HostilePeer,
    ::testing::Values(Misbehaviour{"Garbage",
                                   [](test::ScriptedPeer &peer) {
                                       auto client = greeted(peer);
                                       client.trySend("HTTP/1.1 400 Bad Request\r\n\r\n");
                                       expectFatalErrorAndClose(client);
                                   }},
                      Misbehaviour{"HalfAHeader",
                                   [](test::ScriptedPeer &peer) {
                                       auto client = greeted(peer);
                                       client.trySend(initializeResponse().substr(0, 8));
                                       client.expectClosed();
                                   }},
                      Misbehaviour{"AHugeLength",
                                   [](test::ScriptedPeer &peer) {
                                       auto client = greeted(peer);
                                       client.trySend(test::hex("4853 01 00 01000001 7FFFFFFFFFFFFFFF"));
                                       expectFatalErrorAndClose(client);
                                   }},
                      Misbehaviour{"ClosesAtOnce", [](test::ScriptedPeer &peer) { peer.accept().close(); }},
                      Misbehaviour{"Silence",
                                   [](test::ScriptedPeer &peer) {
                                       auto client = greeted(peer);
                                       client.expectClosed();
                                   }},
                      Misbehaviour{"WrongMessage",
                                   [](test::ScriptedPeer &peer) {
                                       auto client = greeted(peer);
                                       client.trySend(test::hex("4853 07 00 FFFFFF00 0000000000000004 41424344"));
                                       client.expectClosed();
                                   }}),
    [](const auto &each) { return each.param.name; });

} // namespace
