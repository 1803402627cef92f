#include "unit/simulator/HandTurnedTimers.h"
#include "unit/simulator/TestClient.h"

#include "simulator/instrument/Instrument.h"
#include "simulator/traffic/LogLine.h"
#include "simulator/traffic/MessageText.h"
#include "simulator/traffic/RecentTraffic.h"

#include <gmock/gmock.h>

using namespace simulator;
using testing::ElementsAre;
using testing::EndsWith;
using testing::IsEmpty;

namespace
{

/// In one piece, and byte by byte: both have to come to the same.
std::string textOf(std::string_view message)
{
    MessageText whole;
    whole.add(message);
    MessageText slow;
    for (std::size_t i = 0; i < message.size(); ++i)
        slow.add(message.substr(i, 1));
    const std::string text = whole.take();
    EXPECT_EQ(slow.take(), text);
    return text;
}

/// Keeps everything as "protocol client arrow text".
class Notes final : public TrafficLog::Watcher
{
public:
    void seen(const TrafficLog::Entry &entry) override
    {
        lines.push_back(std::string(entry.protocol) + " " + std::string(entry.client) + " " +
                        std::string(arrowOf(entry.kind)) + " " + std::string(entry.text));
    }
    std::vector<std::string> lines;
};

} // namespace

TEST(MessageText, ShowsControlBytesAsEscapes)
{
    EXPECT_EQ(textOf("*IDN?\n"), "*IDN?\\n");
    EXPECT_EQ(textOf("a\r\n\tb\\c"), "a\\r\\n\\tb\\\\c");
    EXPECT_EQ(textOf(std::string_view("\0\x1B[2J\x7F\xC3\xA4", 8)), "\\x00\\x1B[2J\\x7F\\xC3\\xA4");
    EXPECT_EQ(textOf(""), "");
}

TEST(MessageText, AbbreviatesBlocks)
{
    EXPECT_EQ(textOf("MMEM:DATA 'f',#15a\nb;c;*OPC?\n"), "MMEM:DATA 'f',#15<5 bytes>;*OPC?\\n");
    EXPECT_EQ(textOf("X #11a,#10,#212" + std::string(12, '\0') + "\n"), "X #11<1 byte>,#10<0 bytes>,#212<12 bytes>\\n");
    EXPECT_EQ(textOf("X #0abc\n"), "X #0<4 bytes>") << "everything up to the end of the message";
    EXPECT_EQ(textOf("X #15ab"), "X #15<2 bytes>") << "cut off";
    EXPECT_EQ(textOf("X #H1F,#2x\n"), "X #H1F,#2x\\n") << "no blocks";
    EXPECT_EQ(textOf("X '#15',\"#11\"#11a\n"), "X '#15',\"#11\"#11<1 byte>\\n") << "not in strings";
}

TEST(MessageText, CountsBlocksThatPassByElsewhere)
{
    MessageText text;
    text.add("D #41024ab");
    text.skip(1000);
    text.add(std::string(22, 'x') + ";E\n");
    EXPECT_EQ(text.take(), "D #41024<1024 bytes>;E\\n");
    text.add("D #13abc\n");
    EXPECT_EQ(text.take(), "D #13<3 bytes>\\n") << "the next one starts anew";
}

TEST(MessageText, CutsLongMessages)
{
    EXPECT_EQ(textOf(std::string(240, 'a')), std::string(240, 'a'));
    EXPECT_EQ(textOf(std::string(241, 'a')), std::string(240, 'a') + "... (241 bytes in all)");
    EXPECT_EQ(textOf(std::string(239, 'a') + "\n\n"), std::string(239, 'a') + "... (241 bytes in all)");
    MessageText text;
    text.add(std::string(300, 'a') + "#19");
    text.skip(9);
    EXPECT_EQ(text.take(), std::string(240, 'a') + "... (312 bytes in all)");
}

class Traffic : public testing::Test
{
protected:
    HandTurnedTimers timers;
    Instrument instrument{timers, {}};
    Notes notes;
};

TEST_F(Traffic, IsTellingNothingWhileNobodyWatches)
{
    TrafficLog::Client client(instrument.traffic, "socket", "me");
    client.received(std::as_bytes(std::span("abc", 3)));
    instrument.traffic.add(notes);
    client.messageEnds();
    EXPECT_THAT(notes.lines, ElementsAre("socket me -> ")) << "what passed unseen is not kept";
    instrument.traffic.remove(notes);
    client.event("trigger");
    EXPECT_EQ(notes.lines.size(), 1u);
    EXPECT_EQ(client.messages(), 1u);
}

TEST_F(Traffic, NamesTheClientsThatAreConnected)
{
    instrument.traffic.add(notes);
    {
        TrafficLog::Client first(instrument.traffic, "socket", "a");
        TrafficLog::Client second(instrument.traffic, "hislip", "b");
        EXPECT_THAT(instrument.traffic.clients(), ElementsAre(&first, &second));
    }
    EXPECT_THAT(instrument.traffic.clients(), IsEmpty());
    EXPECT_THAT(notes.lines, ElementsAre("socket a -- connected", "hislip b -- connected", "hislip b -- disconnected",
                                         "socket a -- disconnected"));
}

TEST_F(Traffic, ShowsMessagesAnswersAndWhatHappensBesides)
{
    TrafficLog::Client client(instrument.traffic, "hislip", "me");
    TestClient tester(instrument);
    tester.exchange.setTraffic(&client);
    instrument.traffic.add(notes);
    tester.send("*SRE 32;*ESE 32;:FOO;*ESR?\n");
    tester.exchange.trigger();
    tester.exchange.poll();
    EXPECT_THAT(notes.lines,
                ElementsAre("hislip me -- service request 0x64", "hislip me -> *SRE 32;*ESE 32;:FOO;*ESR?\\n",
                            "hislip me <- 160\\n", "hislip me -- trigger", "hislip me -- serial poll 0x04"))
        << "a message is shown when it has ended, and its units run as they come";
    instrument.traffic.remove(notes);
    tester.exchange.setTraffic(nullptr);
}

TEST_F(Traffic, ForgetsAMessageThatADeviceClearEnds)
{
    TrafficLog::Client client(instrument.traffic, "hislip", "me");
    TestClient tester(instrument);
    tester.exchange.setTraffic(&client);
    instrument.traffic.add(notes);
    tester.send("*IDN?;*ID");
    tester.exchange.clear();
    tester.send("*OPC?\n");
    EXPECT_THAT(notes.lines, ElementsAre("hislip me -> *OPC?\\n", "hislip me <- 1\\n"));
    instrument.traffic.remove(notes);
    tester.exchange.setTraffic(nullptr);
}

TEST_F(Traffic, ShowsLocks)
{
    TrafficLog::Client one(instrument.traffic, "hislip", "one");
    TrafficLog::Client two(instrument.traffic, "vxi11", "two");
    const LockTable::Owner first = instrument.locks.join([] {}, &one);
    const LockTable::Owner second = instrument.locks.join([] {}, &two);
    instrument.traffic.add(notes);
    const auto ignore = [](LockTable::Answer) {};
    using std::chrono::milliseconds;
    instrument.locks.request(first, "", milliseconds{0}, ignore);
    instrument.locks.request(first, "", milliseconds{0}, ignore);
    instrument.locks.request(second, "k\n", milliseconds{0}, ignore);
    instrument.locks.request(second, "k\n", milliseconds{10}, ignore);
    instrument.locks.release(first);
    timers.turn();
    instrument.locks.release(second);
    instrument.traffic.remove(notes);
    EXPECT_THAT(notes.lines,
                ElementsAre("hislip one -- lock exclusive: granted",
                            "hislip one -- lock exclusive: held or asked for already",
                            "vxi11 two -- lock shared 'k\\n': not granted", "hislip one -- unlock exclusive",
                            "vxi11 two -- lock shared 'k\\n': granted", "vxi11 two -- unlock shared 'k\\n'"));
}

TEST_F(Traffic, KeepsTheLastLinesForThePage)
{
    RecentTraffic recent(instrument.traffic);
    TrafficLog::Client client(instrument.traffic, "socket", "me");
    for (int i = 0; i < 40; ++i)
        client.event("event " + std::to_string(i));
    ASSERT_EQ(recent.lines().size(), 30u);
    EXPECT_EQ(recent.lines().front().text, "event 10");
    EXPECT_EQ(recent.lines().back().text, "event 39");
    EXPECT_EQ(recent.lines().back().client, "me");
    EXPECT_EQ(recent.lines().back().arrow, "--");
}

TEST(LogTime, HasMilliseconds)
{
    using namespace std::chrono;
    EXPECT_THAT(timeOfDay(system_clock::time_point{milliseconds{1'000'007}}), EndsWith(":40.007"));
    EXPECT_EQ(timeOfDay(system_clock::now()).size(), 12u);
}
