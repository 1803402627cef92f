#include "unit/simulator/HandTurnedTimers.h"
#include "wire/Hex.h"

#include "simulator/instrument/Instrument.h"
#include "simulator/mdns/MdnsResponder.h"

#include <gmock/gmock.h>

using namespace simulator;
using namespace wire::dns;
using std::chrono::milliseconds;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

namespace
{

const Name Hislip = {"_hislip", "_tcp", "local"};
const Name Enumeration = {"_services", "_dns-sd", "_udp", "local"};
const Name Instance = {"Oltrava M - 7", "_hislip", "_tcp", "local"};
const Name Host = {"m-7", "local"};
const Ipv4 Address = {10, 0, 0, 9};

Identification identity()
{
    return {"Oltrava", "M", "7", "1.0"};
}

class Network final : public MdnsLink
{
public:
    struct Direct {
        std::vector<std::byte> bytes;
        std::uint16_t port;
    };

    void multicast(std::span<const std::byte> message) override
    {
        Message decoded;
        EXPECT_TRUE(decode(message, decoded));
        heard.push_back(std::move(decoded));
    }
    void unicast(std::span<const std::byte> message, const MdnsPeer &to) override
    {
        direct.push_back({{message.begin(), message.end()}, to.port});
    }

    std::vector<Message> heard; ///< by all
    std::vector<Direct> direct;
};

class Mdns : public testing::Test
{
protected:
    Mdns()
    {
        m_responder.emplace(timers, MdnsRecords(identity(), {{"_hislip", 4880}}), 1,
                            [this](const std::string &news) { told.push_back(news); });
        m_responder->add(network, {{Address}, {}});
        m_responder->start();
    }

    /// Through probing and announcing, and past the second in which nothing is said again.
    void announce()
    {
        timers.turn(std::chrono::seconds{5});
        network.heard.clear();
    }

    void receive(const Message &message, std::uint16_t port = 5353)
    {
        const std::vector<std::byte> bytes = encode(message);
        ASSERT_FALSE(bytes.empty());
        receive(bytes, port);
    }
    void receive(const std::vector<std::byte> &bytes, std::uint16_t port = 5353)
    {
        MdnsPeer from;
        from.port = port;
        m_responder->received(network, bytes, from);
    }

    static Message question(Name name, std::uint16_t type, bool unicast = false)
    {
        Message message;
        message.questions = {{std::move(name), type, Internet, unicast}};
        return message;
    }
    static Message claim(Name name, std::uint16_t type, decltype(Record::data) data)
    {
        Message message;
        message.flags = ResponseFlag | AuthoritativeFlag;
        message.answers = {{std::move(name), type, Internet, true, 120, std::move(data)}};
        return message;
    }
    static Message someoneElsesService() { return claim(Instance, TypeSrv, Service{0, 0, 4881, {"other", "local"}}); }

    void end() { m_responder.reset(); }

    HandTurnedTimers timers;
    Network network;
    std::vector<std::string> told;

private:
    std::optional<MdnsResponder> m_responder;
};

} // namespace

TEST(MdnsRecords, NameTheInstrumentAndItsHost)
{
    MdnsRecords records({"Oltrava", "KyVisa Simulator", "10/01", "1"}, {{"_http", 80}});
    EXPECT_EQ(records.instance(), "Oltrava KyVisa Simulator - 10/01");
    EXPECT_EQ(records.host().text(), "kyvisa-simulator-10-01.local");
    records.rename();
    EXPECT_EQ(records.instance(), "Oltrava KyVisa Simulator - 10/01 (2)");
    EXPECT_EQ(records.host().text(), "kyvisa-simulator-10-01-2.local");
}

TEST(MdnsRecords, KeepLongNamesWithinALabel)
{
    // The cut would fall into the two bytes of the last letter.
    MdnsRecords records({std::string(57, 'a') + " bc\u00E4\u00E4\u00E4", "", "", ""}, {});
    EXPECT_EQ(records.instance(), std::string(57, 'a') + " bc\u00E4");
    records.rename();
    EXPECT_EQ(records.instance(), std::string(57, 'a') + " b (2)");
    EXPECT_EQ(records.host().text(), "instrument-2.local") << "nothing of the model is left for a host's name";
}

TEST(MdnsRecords, TellWhatTheInstrumentIs)
{
    const MdnsRecords records(identity(), {{"_hislip", 4880}});
    const auto answers = records.answersTo({Instance, TypeTxt, Internet, false}, {});
    ASSERT_EQ(answers.size(), 1u);
    EXPECT_THAT(std::get<Text>(answers[0].data).strings,
                ElementsAre("txtvers=1", "Manufacturer=Oltrava", "Model=M", "SerialNumber=7", "FirmwareVersion=1.0"));
    EXPECT_THAT(records.answersTo({Instance, TypeAny, Internet, false}, {}), SizeIs(2));
    EXPECT_THAT(records.answersTo({Instance, TypeAny, 3, false}, {}), IsEmpty()) << "another class";
    EXPECT_THAT(records.answersTo({{"x", "local"}, TypeAny, Internet, false}, {}), IsEmpty());
}

TEST_F(Mdns, AsksThreeTimesWhetherItsNamesAreFreeAndThenAnnouncesTwice)
{
    timers.turn(milliseconds{250});
    ASSERT_THAT(network.heard, SizeIs(1));
    const Message probe = network.heard[0];
    EXPECT_FALSE(probe.isResponse());
    EXPECT_THAT(probe.questions,
                ElementsAre(Question{Instance, TypeAny, Internet, false}, Question{Host, TypeAny, Internet, false}));
    EXPECT_THAT(probe.authorities, SizeIs(3)) << "SRV, TXT, A";
    timers.turn(milliseconds{500});
    ASSERT_GE(network.heard.size(), 3u);
    EXPECT_EQ(network.heard[1], probe);
    EXPECT_EQ(network.heard[2], probe);
    timers.turn(milliseconds{250});
    ASSERT_THAT(network.heard, SizeIs(4));
    const Message announcement = network.heard[3];
    EXPECT_EQ(announcement.flags, 0x8400);
    EXPECT_THAT(announcement.answers,
                ElementsAre(Record{Enumeration, TypePtr, Internet, false, 4500, Pointer{Hislip}},
                            Record{Hislip, TypePtr, Internet, false, 4500, Pointer{Instance}},
                            Record{Instance, TypeSrv, Internet, true, 120, Service{0, 0, 4880, Host}},
                            Record{Instance, TypeTxt, Internet, true, 4500,
                                   Text{{"txtvers=1", "Manufacturer=Oltrava", "Model=M", "SerialNumber=7",
                                         "FirmwareVersion=1.0"}}},
                            Record{Host, TypeA, Internet, true, 120, Address}));
    timers.turn(std::chrono::minutes{1});
    ASSERT_THAT(network.heard, SizeIs(5));
    EXPECT_EQ(network.heard[4], announcement);
    EXPECT_THAT(told, IsEmpty());
}

TEST_F(Mdns, AnswersNothingBeforeItHasItsName)
{
    timers.turn(milliseconds{250});
    network.heard.clear();
    receive(question(Hislip, TypePtr), 40000);
    EXPECT_THAT(network.direct, IsEmpty());
}

TEST_F(Mdns, TakesAnotherNameWhenItsOwnIsTaken)
{
    timers.turn(milliseconds{250});
    receive(someoneElsesService());
    EXPECT_THAT(told, ElementsAre("mdns: the name is taken, trying Oltrava M - 7 (2)"));
    network.heard.clear();
    timers.turn(std::chrono::seconds{5});
    ASSERT_THAT(network.heard, SizeIs(5)) << "three probes and two announcements";
    EXPECT_EQ(network.heard[0].questions[0].name.text(), "Oltrava M - 7 (2)._hislip._tcp.local");
    EXPECT_EQ(network.heard[0].questions[1].name.text(), "m-7-2.local");
}

TEST_F(Mdns, TakesAnotherNameWhenItsHostIsTaken)
{
    timers.turn(milliseconds{250});
    receive(claim({"M-7", "LOCAL"}, TypeA, Ipv4{10, 0, 0, 10}));
    EXPECT_THAT(told, ElementsAre("mdns: the name is taken, trying Oltrava M - 7 (2)"));
}

TEST_F(Mdns, IsNotIrritatedByItsOwnWords)
{
    std::size_t echoed = 0;
    for (int i = 0; i < 300; ++i) {
        timers.turn(milliseconds{10});
        while (echoed < network.heard.size())
            receive(Message(network.heard[echoed++]));
    }
    EXPECT_THAT(told, IsEmpty());
    EXPECT_THAT(network.heard, SizeIs(5)) << "three probes and two announcements";
}

TEST_F(Mdns, GivesUpWhenEveryNameIsTaken)
{
    for (int i = 0; i < 60 && told.size() < 50; ++i) {
        network.heard.clear();
        for (int wait = 0; network.heard.empty() && wait < 600; ++wait)
            timers.turn(milliseconds{10});
        ASSERT_FALSE(network.heard.empty());
        const Name name = network.heard[0].questions.at(0).name;
        receive(claim(name, TypeSrv, Service{0, 0, 1, {"other", "local"}}));
    }
    ASSERT_FALSE(told.empty());
    EXPECT_EQ(told.back(), "mdns: every name is taken, the instrument is not announced");
    EXPECT_THAT(told, SizeIs(50));
    EXPECT_EQ(timers.waiting(), 0u);
}

TEST_F(Mdns, WaitsWhenAnotherOneAsksForTheSameNameWithLaterData)
{
    timers.turn(milliseconds{250});
    Message theirs = network.heard.at(0);
    std::get<Service>(theirs.authorities.at(0).data).port = 4881; // later than 4880
    network.heard.clear();
    receive(theirs);
    timers.turn(milliseconds{999});
    EXPECT_THAT(network.heard, IsEmpty());
    timers.turn(milliseconds{1});
    EXPECT_THAT(network.heard, SizeIs(1));
    EXPECT_THAT(told, IsEmpty()) << "it asks again for the same name";
}

TEST_F(Mdns, GoesOnWhenAnotherOneAsksForTheSameNameWithEarlierData)
{
    timers.turn(milliseconds{250});
    Message theirs = network.heard.at(0);
    std::get<Service>(theirs.authorities.at(0).data).port = 4879;
    receive(theirs);
    timers.turn(milliseconds{750});
    EXPECT_THAT(network.heard, SizeIs(4)) << "three probes and the first announcement";
}

// Typed from RFC 6762, 6.7: the id and the question come back, times to live are short, nobody is told to forget others.
TEST_F(Mdns, AnswersAProgramThatKnowsNoMulticastDnsInItsOwnWay)
{
    announce();
    receive(hex("12 34 | 00 00 | 00 01 | 00 00 | 00 00 | 00 00 | 07 '_hislip' 04 '_tcp' 05 'local' 00 | 00 0C | 00 01"),
            40000);
    ASSERT_THAT(network.direct, SizeIs(1));
    EXPECT_EQ(network.direct[0].port, 40000);
    EXPECT_EQ(
        network.direct[0].bytes,
        hex("12 34 | 84 00 | 00 01 | 00 01 | 00 00 | 00 03 | 07 '_hislip' 04 '_tcp' 05 'local' 00 | 00 0C | 00 01 |"
            "C0 0C | 00 0C | 00 01 | 00 00 00 0A | 00 10 | 0D 'Oltrava M - 7' C0 0C |"
            "C0 30 | 00 21 | 00 01 | 00 00 00 0A | 00 0C | 00 00 | 00 00 | 13 10 | 03 'm-7' C0 19 |"
            "C0 30 | 00 10 | 00 01 | 00 00 00 0A | 00 4A | 09 'txtvers=1' 14 'Manufacturer=Oltrava' 07 'Model=M'"
            "0E 'SerialNumber=7' 13 'FirmwareVersion=1.0' |"
            "C0 52 | 00 01 | 00 01 | 00 00 00 0A | 00 04 | 0A 00 00 09"));
    EXPECT_THAT(network.heard, IsEmpty());
}

TEST_F(Mdns, AnswersWhoAsksForAnAnswerOfItsOwnDirectly)
{
    announce();
    receive(question(Instance, TypeSrv, true));
    ASSERT_THAT(network.direct, SizeIs(1));
    Message answer;
    ASSERT_TRUE(decode(network.direct[0].bytes, answer));
    EXPECT_EQ(answer.id, 0);
    EXPECT_THAT(answer.questions, IsEmpty());
    EXPECT_THAT(answer.answers, ElementsAre(Record{Instance, TypeSrv, Internet, true, 120, Service{0, 0, 4880, Host}}));
    EXPECT_THAT(answer.additionals, ElementsAre(Record{Host, TypeA, Internet, true, 120, Address}));
}

TEST_F(Mdns, AnswersAllTogetherAndNotAtOnceWhatOthersMayAnswerToo)
{
    announce();
    receive(question(Hislip, TypePtr));
    receive(question(Enumeration, TypePtr));
    timers.turn(milliseconds{19});
    EXPECT_THAT(network.heard, IsEmpty());
    timers.turn(milliseconds{101});
    ASSERT_THAT(network.heard, SizeIs(1));
    EXPECT_THAT(network.heard[0].answers,
                ElementsAre(Record{Hislip, TypePtr, Internet, false, 4500, Pointer{Instance}},
                            Record{Enumeration, TypePtr, Internet, false, 4500, Pointer{Hislip}}));
    EXPECT_THAT(network.heard[0].additionals, SizeIs(3)) << "SRV, TXT, A";
}

TEST_F(Mdns, AnswersAtOnceWhatNobodyElseAnswers)
{
    announce();
    receive(question(Host, TypeA));
    timers.turn();
    ASSERT_THAT(network.heard, SizeIs(1));
    EXPECT_THAT(network.heard[0].answers, ElementsAre(Record{Host, TypeA, Internet, true, 120, Address}));
}

TEST_F(Mdns, DoesNotSayAgainWhatItHasJustSaid)
{
    announce();
    receive(question(Host, TypeA));
    timers.turn(milliseconds{500});
    receive(question(Host, TypeA));
    timers.turn(milliseconds{499});
    EXPECT_THAT(network.heard, SizeIs(1));
    timers.turn(milliseconds{2});
    receive(question(Host, TypeA));
    timers.turn(milliseconds{200});
    EXPECT_THAT(network.heard, SizeIs(2));
}

TEST_F(Mdns, DoesNotSayWhatIsKnown)
{
    announce();
    Message query = question(Hislip, TypePtr);
    query.answers = {{Hislip, TypePtr, Internet, false, 2250, Pointer{Instance}}};
    receive(query);
    timers.turn(milliseconds{200});
    EXPECT_THAT(network.heard, IsEmpty());
    query.answers[0].ttl = 2249; // less than half of its life is left
    receive(query);
    timers.turn(milliseconds{200});
    EXPECT_THAT(network.heard, SizeIs(1));
}

TEST_F(Mdns, DefendsItsNameAtOnce)
{
    announce();
    Message probe = question(Instance, TypeAny);
    probe.authorities = {{Instance, TypeSrv, Internet, false, 120, Service{0, 0, 1, {"other", "local"}}}};
    receive(probe);
    EXPECT_THAT(network.heard, SizeIs(1));
    receive(probe);
    EXPECT_THAT(network.heard, SizeIs(2)) << "each time";
}

TEST_F(Mdns, AsksAgainWhenSomebodyClaimsItsNameLater)
{
    announce();
    receive(someoneElsesService());
    timers.turn(milliseconds{250});
    ASSERT_THAT(network.heard, SizeIs(1));
    EXPECT_FALSE(network.heard[0].isResponse());
    EXPECT_EQ(network.heard[0].questions[0].name, Instance) << "the name is still its own, until somebody answers";
    EXPECT_THAT(told, IsEmpty());
}

TEST_F(Mdns, SaysGoodbye)
{
    announce();
    end();
    ASSERT_THAT(network.heard, SizeIs(1));
    EXPECT_THAT(network.heard[0].answers, SizeIs(4)) << "other instruments may still be found among the service types";
    for (const Record &record : network.heard[0].answers)
        EXPECT_EQ(record.ttl, 0u);
    EXPECT_EQ(timers.waiting(), 0u);
}

TEST_F(Mdns, SaysNoGoodbyeWhenItWasNeverThere)
{
    timers.turn(milliseconds{250});
    network.heard.clear();
    end();
    EXPECT_THAT(network.heard, IsEmpty());
    EXPECT_EQ(timers.waiting(), 0u);
}

TEST_F(Mdns, PassesOverWhatItCannotUse)
{
    announce();
    receive(std::vector<std::byte>{});
    receive(hex("12 34 | 00 00 | 00 01 | 00 00 | 00 00 | 00 00 | C0 0C"), 40000);
    Message query = question(Hislip, TypePtr);
    query.flags = 0x0800; // another operation
    receive(query, 40000);
    query.flags = 0x0003; // an error
    receive(query, 40000);
    receive(someoneElsesService(), 40000); // a response that comes from no responder
    Message goodbye = someoneElsesService();
    goodbye.answers[0].ttl = 0;
    receive(goodbye);
    timers.turn(std::chrono::seconds{1});
    EXPECT_THAT(network.heard, IsEmpty());
    EXPECT_THAT(network.direct, IsEmpty());
    EXPECT_THAT(told, IsEmpty());
}
