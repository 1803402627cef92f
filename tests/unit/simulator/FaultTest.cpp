#include "unit/simulator/InstrumentTest.h"

#include "simulator/fault/Faults.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

namespace
{

using simulator::FaultKind;
using simulator::FaultProtocol;
using simulator::Faults;
using simulator::FaultSpec;
using simulator::MessageForm;
using simulator::parseFaultSpec;

struct Wrong {
    const char *spec;
    const char *reason;
};

constexpr const char *KindNames = "delay drop-reply cut short-header oversized-header garbage change-byte stale-id "
                                  "no-end refuse-lock withhold-srq repeat-srq nonsense-status fill-errors";

TEST(FaultSpec, ReadsPlaceKindAndCondition)
{
    const FaultSpec spec = parseFaultSpec("hislip:drop-reply:p=0.01");
    EXPECT_EQ(spec.protocol, FaultProtocol::Hislip);
    EXPECT_EQ(spec.kind, FaultKind::DropReply);
    EXPECT_EQ(spec.when, FaultSpec::When::Probability);
    EXPECT_EQ(spec.probability, 0.01);
    EXPECT_FALSE(spec.value);
    EXPECT_FALSE(spec.allMessages);
    EXPECT_EQ(spec.text, "hislip:drop-reply:p=0.01");
}

TEST(FaultSpec, ReadsValuesCountsAndAllMessages)
{
    const FaultSpec delay = parseFaultSpec("any:delay=0.5:nth=10");
    EXPECT_EQ(delay.protocol, std::nullopt);
    EXPECT_EQ(delay.value, 0.5);
    EXPECT_EQ(delay.when, FaultSpec::When::Nth);
    EXPECT_EQ(delay.number, 10u);
    const FaultSpec cut = parseFaultSpec("vxi11:cut=3:on=all:every=100");
    EXPECT_EQ(cut.value, 3);
    EXPECT_EQ(cut.when, FaultSpec::When::Every);
    EXPECT_EQ(cut.number, 100u);
    EXPECT_TRUE(cut.allMessages);
    EXPECT_EQ(parseFaultSpec("socket:garbage").when, FaultSpec::When::Always);
}

TEST(FaultSpec, SaysWhatIsWrongWithIt)
{
    const std::string kinds = std::string("there is no kind of fault \"eat\"; they are ") + KindNames;
    const std::string noKind = std::string("there is no kind of fault \"\"; they are ") + KindNames;
    const Wrong rows[] = {
        {"", "a fault is PROTOCOL:KIND, for example \"hislip:drop-reply:p=0.01\", not \"\""},
        {"hislip", "a fault is PROTOCOL:KIND, for example \"hislip:drop-reply:p=0.01\", not \"hislip\""},
        {"usb:cut", "there is no protocol \"usb\"; they are any hislip hislip-async socket vxi11 gpib serial"},
        {"HISLIP:cut", "there is no protocol \"HISLIP\"; they are any hislip hislip-async socket vxi11 gpib serial"},
        {":cut", "there is no protocol \"\"; they are any hislip hislip-async socket vxi11 gpib serial"},
        {"socket:eat", kinds.c_str()},
        {"socket:", noKind.c_str()},
        {"any:delay", "delay needs a value, for example delay=0.5"},
        {"any:delay=", "delay needs a number, not \"\""},
        {"any:delay=soon", "delay needs a number, not \"soon\""},
        {"any:delay=1s", "delay needs a number, not \"1s\""},
        {"any:delay=nan", "delay needs a number, not \"nan\""},
        {"any:delay=-1", "delay is between 0 and 3600, not -1"},
        {"any:delay=3601", "delay is between 0 and 3600, not 3601"},
        {"any:drop-reply=1", "drop-reply takes no value"},
        {"socket:cut=1.5", "cut needs a whole number, not \"1.5\""},
        {"hislip:repeat-srq=1", "repeat-srq is between 2 and 100, not 1"},
        {"hislip:nonsense-status=256", "nonsense-status is between 0 and 255, not 256"},
        {"socket:cut:p=2", "p is between 0 and 1, not 2"},
        {"socket:cut:p", "p needs a number, not \"\""},
        {"socket:cut:nth=0", "nth is between 1 and 9007199254740992, not 0"},
        {"socket:cut:every=2.5", "every needs a whole number, not \"2.5\""},
        {"socket:cut:nth=2:p=0.5", "only one of p, nth and every can hold"},
        {"socket:cut:often", "there is no condition \"often\"; they are p, nth, every and on"},
        {"socket:cut:", "there is no condition \"\"; they are p, nth, every and on"},
        {"socket:cut:on=none", "on is \"all\" or \"answers\", not \"none\""},
        {"hislip:refuse-lock:on=all", "on=all means nothing with refuse-lock"},
    };
    for (const Wrong &row : rows) {
        try {
            parseFaultSpec(row.spec);
            ADD_FAILURE() << "taken: " << row.spec;
        } catch (const simulator::FaultSpecError &error) {
            EXPECT_STREQ(error.what(), row.reason) << row.spec;
        }
    }
    EXPECT_THROW(parseFaultSpec("socket:cut:nth=" + std::string(200, '0') + "1"), simulator::FaultSpecError);
}

TEST(FaultSpec, RefusesAKindThatMakesNoSenseOnTheProtocol)
{
    const Wrong rows[] = {
        {"serial:cut", "cut makes no sense on serial: it has no connection"},
        {"socket:short-header", "short-header makes no sense on socket: its messages have no header"},
        {"serial:oversized-header", "oversized-header makes no sense on serial: its messages have no header"},
        {"hislip-async:change-byte", "change-byte makes no sense on hislip-async: no answers go over it"},
        {"socket:stale-id", "stale-id makes no sense on socket: its messages carry no id"},
        {"serial:stale-id", "stale-id makes no sense on serial: its messages carry no id"},
        {"hislip-async:stale-id", "stale-id makes no sense on hislip-async: its messages carry no id"},
        {"hislip-async:no-end", "no-end makes no sense on hislip-async: no answers go over it"},
        {"socket:refuse-lock", "refuse-lock makes no sense on socket: clients cannot lock over it"},
        {"serial:withhold-srq", "withhold-srq makes no sense on serial: it has no service requests"},
        {"socket:repeat-srq", "repeat-srq makes no sense on socket: it has no service requests"},
        {"serial:nonsense-status", "nonsense-status makes no sense on serial: it has no status byte of its own"},
    };
    for (const Wrong &row : rows) {
        try {
            parseFaultSpec(row.spec);
            ADD_FAILURE() << "taken: " << row.spec;
        } catch (const simulator::FaultSpecError &error) {
            EXPECT_STREQ(error.what(), row.reason) << row.spec;
        }
    }
}

/// An answer of 8 bytes as each protocol would describe it.
MessageForm answer(FaultProtocol protocol)
{
    MessageForm form{protocol, true};
    form.payloadSize = 8;
    form.end = simulator::EndMark::LastByte;
    return form;
}

/// One mark a question: where a fault struck.
std::string strikes(Faults &faults, int questions, FaultProtocol protocol = FaultProtocol::Socket)
{
    std::string marks;
    for (int i = 0; i < questions; ++i)
        marks += faults.strike(answer(protocol), 9) ? 'x' : '.';
    return marks;
}

TEST(Faults, StrikeAtTheNthMessageAndNeverAgain)
{
    Faults faults(1, {});
    faults.add(parseFaultSpec("socket:drop-reply:nth=3"));
    EXPECT_EQ(strikes(faults, 9), "..x......");
    EXPECT_EQ(faults.entries().front().seen, 9u);
    EXPECT_EQ(faults.entries().front().struck, 1u);
}

TEST(Faults, StrikeAtEveryNthMessage)
{
    Faults faults(1, {});
    faults.add(parseFaultSpec("socket:drop-reply:every=4"));
    EXPECT_EQ(strikes(faults, 12), "...x...x...x");
}

TEST(Faults, StrikeAsOftenAsTheProbabilitySays)
{
    Faults faults(7, {});
    faults.add(parseFaultSpec("socket:drop-reply:p=0.25"));
    strikes(faults, 10000);
    EXPECT_NEAR(static_cast<double>(faults.entries().front().struck), 2500, 200);
    Faults never(7, {});
    never.add(parseFaultSpec("socket:drop-reply:p=0"));
    EXPECT_EQ(strikes(never, 20), "....................");
    Faults always(7, {});
    always.add(parseFaultSpec("socket:drop-reply:p=1"));
    EXPECT_EQ(strikes(always, 20), "xxxxxxxxxxxxxxxxxxxx");
}

TEST(Faults, StrikeTheSameWithTheSameSeed)
{
    Faults first(42, {});
    Faults second(42, {});
    Faults third(43, {});
    for (Faults *faults : {&first, &second, &third})
        faults->add(parseFaultSpec("socket:drop-reply:p=0.5"));
    const std::string marks = strikes(first, 200);
    EXPECT_EQ(strikes(second, 200), marks);
    EXPECT_NE(strikes(third, 200), marks);
    first.restart(42);
    EXPECT_EQ(strikes(first, 200), marks) << "afresh after a restart";
}

TEST(Faults, OneMoreDoesNotChangeWhenTheOthersStrike)
{
    Faults alone(5, {});
    Faults both(5, {});
    alone.add(parseFaultSpec("socket:drop-reply:p=0.5"));
    both.add(parseFaultSpec("socket:drop-reply:p=0.5"));
    both.add(parseFaultSpec("socket:fill-errors:p=0"));
    EXPECT_EQ(strikes(both, 100), strikes(alone, 100));
}

TEST(Faults, CountOnlyWhatConcernsThem)
{
    Faults faults(1, {});
    faults.add(parseFaultSpec("socket:drop-reply:nth=2"));
    EXPECT_EQ(strikes(faults, 5, FaultProtocol::Serial), ".....");
    MessageForm acknowledgement = answer(FaultProtocol::Socket);
    acknowledgement.answer = false;
    EXPECT_FALSE(faults.strike(acknowledgement, 9)) << "no answer";
    EXPECT_EQ(strikes(faults, 3), ".x.");

    Faults all(1, {});
    all.add(parseFaultSpec("socket:drop-reply:nth=2:on=all"));
    all.strike(acknowledgement, 9);
    EXPECT_EQ(strikes(all, 2), "x.");

    Faults any(1, {});
    any.add(parseFaultSpec("any:drop-reply:nth=2"));
    EXPECT_EQ(strikes(any, 1, FaultProtocol::Serial), ".");
    EXPECT_EQ(strikes(any, 1, FaultProtocol::Gpib), "x");
}

TEST(Faults, LeaveAloneWhatHasNothingToDamage)
{
    MessageForm bare{FaultProtocol::Hislip, true};
    for (const char *spec : {"hislip:short-header", "hislip:oversized-header", "hislip:change-byte", "hislip:stale-id",
                             "hislip:no-end", "hislip:refuse-lock"}) {
        Faults faults(1, {});
        faults.add(parseFaultSpec(spec));
        EXPECT_FALSE(faults.strike(bare, 16)) << spec;
        EXPECT_EQ(faults.entries().front().seen, 0u) << spec;
    }
}

TEST(Faults, SeveralStrikeOneMessage)
{
    Faults faults(1, {});
    faults.add(parseFaultSpec("socket:delay=0.25"));
    faults.add(parseFaultSpec("any:delay=0.5"));
    faults.add(parseFaultSpec("socket:cut=4"));
    const auto damage = faults.strike(answer(FaultProtocol::Socket), 9);
    ASSERT_TRUE(damage);
    EXPECT_EQ(damage->delay, std::chrono::milliseconds(750));
    EXPECT_EQ(damage->cutAt, 4u);
}

TEST(Faults, CutInTheMiddleAndNeverBehindTheLastByte)
{
    Faults faults(1, {});
    faults.add(parseFaultSpec("socket:cut"));
    EXPECT_EQ(faults.strike(answer(FaultProtocol::Socket), 9)->cutAt, 4u);
    Faults late(1, {});
    late.add(parseFaultSpec("socket:cut=100"));
    EXPECT_EQ(late.strike(answer(FaultProtocol::Socket), 9)->cutAt, 8u);
}

TEST(Faults, TellAStatusByteThatIsNeverTheTruth)
{
    Faults faults(1, {});
    EXPECT_EQ(faults.told(FaultProtocol::Hislip, 0x44), 0x44);
    faults.add(parseFaultSpec("hislip-async:nonsense-status"));
    for (int truth = 0; truth < 256; ++truth)
        EXPECT_NE(faults.told(FaultProtocol::Hislip, static_cast<std::uint8_t>(truth)), truth);
    EXPECT_EQ(faults.told(FaultProtocol::Vxi11, 0x44), 0x44);
    faults.clear();
    faults.add(parseFaultSpec("hislip:nonsense-status=255:nth=2"));
    EXPECT_EQ(faults.told(FaultProtocol::Hislip, 0), 0);
    EXPECT_EQ(faults.told(FaultProtocol::Hislip, 0), 255);
}

TEST(Faults, WithholdOrRepeatServiceRequests)
{
    Faults faults(1, {});
    EXPECT_EQ(faults.serviceRequests(FaultProtocol::Vxi11), 1u);
    const auto repeat = faults.add(parseFaultSpec("vxi11:repeat-srq"));
    EXPECT_EQ(faults.serviceRequests(FaultProtocol::Vxi11), 2u);
    EXPECT_TRUE(faults.remove(*repeat));
    EXPECT_FALSE(faults.remove(*repeat));
    faults.add(parseFaultSpec("vxi11:repeat-srq=5"));
    EXPECT_EQ(faults.serviceRequests(FaultProtocol::Vxi11), 5u);
    EXPECT_EQ(faults.serviceRequests(FaultProtocol::Hislip), 1u);
    faults.add(parseFaultSpec("any:withhold-srq"));
    EXPECT_EQ(faults.serviceRequests(FaultProtocol::Vxi11), 0u);
}

TEST(Faults, RefuseLocks)
{
    Faults faults(1, {});
    EXPECT_FALSE(faults.refusesLock(FaultProtocol::Hislip));
    faults.add(parseFaultSpec("hislip:refuse-lock:every=2"));
    EXPECT_FALSE(faults.refusesLock(FaultProtocol::Hislip));
    EXPECT_TRUE(faults.refusesLock(FaultProtocol::Hislip));
    EXPECT_FALSE(faults.refusesLock(FaultProtocol::Vxi11));
}

TEST(Faults, AreBounded)
{
    Faults faults(1, {});
    for (std::size_t i = 0; i < Faults::Capacity; ++i)
        EXPECT_TRUE(faults.add(parseFaultSpec("socket:delay=0")));
    EXPECT_FALSE(faults.add(parseFaultSpec("socket:delay=0")));
}

class FaultCommands : public InstrumentTest
{
};

TEST_F(FaultCommands, AddListCountAndDelete)
{
    EXPECT_EQ(client.ask("DIAG:FAUL:LIST?\n"), "0\n");
    EXPECT_EQ(client.ask("DIAGnostic:FAULt:ADD \"socket:drop-reply:p=0.01\";ADD 'any:delay=0.5:nth=10'\n"), "");
    EXPECT_EQ(other.ask("DIAG:FAUL:LIST?\n"), "2,1,\"socket:drop-reply:p=0.01\",2,\"any:delay=0.5:nth=10\"\n");
    instrument.faults.strike(answer(FaultProtocol::Serial), 9);
    EXPECT_EQ(client.ask("DIAG:FAUL:COUN? 2\n"), "0\n") << "seen once, struck never";
    client.ask("DIAG:FAUL:DEL 1\n");
    EXPECT_EQ(client.ask("DIAG:FAUL:LIST?\n"), "1,2,\"any:delay=0.5:nth=10\"\n") << "the others keep their numbers";
    client.ask("DIAG:FAUL:DEL ALL\n");
    EXPECT_EQ(client.ask("DIAG:FAUL:LIST?\n"), "0\n");
    client.ask("DIAG:FAUL:ADD 'socket:cut'\n");
    EXPECT_EQ(client.ask("DIAG:FAUL:LIST?\n"), "1,3,\"socket:cut\"\n") << "no number is given twice";
    EXPECT_EQ(client.ask("SYST:ERR?\n"), "0,\"No error\"\n");
}

TEST_F(FaultCommands, GiveTheReasonForARefusal)
{
    client.ask("DIAG:FAUL:ADD 'socket:stale-id'\n");
    EXPECT_EQ(client.ask("SYST:ERR?\n"),
              "-224,\"Illegal parameter value;stale-id makes no sense on socket: its messages carry no id\"\n");
    client.ask("DIAG:FAUL:DEL 9\n");
    EXPECT_EQ(client.ask("SYST:ERR?\n"), "-224,\"Illegal parameter value;there is no such fault\"\n");
    client.ask("DIAG:FAUL:COUN? 9\n");
    EXPECT_EQ(client.ask("SYST:ERR?\n"), "-224,\"Illegal parameter value;there is no such fault\"\n");
    client.ask("DIAG:FAUL:ADD 5\n");
    EXPECT_EQ(client.ask("SYST:ERR?\n"), "-128,\"Numeric data not allowed\"\n");
    for (std::size_t i = 0; i <= Faults::Capacity; ++i)
        client.ask("DIAG:FAUL:ADD 'socket:delay=0'\n");
    EXPECT_EQ(client.ask("SYST:ERR?\n"), "-223,\"Too much data;too many faults\"\n");
}

TEST_F(FaultCommands, SurviveAResetAndTellTheSeed)
{
    client.ask("DIAG:FAUL:SEED 99;ADD 'socket:cut'\n");
    client.ask("*RST;*CLS\n");
    EXPECT_EQ(client.ask("DIAG:FAUL:SEED?;LIST?\n"), "99;1,1,\"socket:cut\"\n");
}

TEST_F(FaultCommands, FillTheErrorQueueOnce)
{
    client.ask("*SRE 4\n");
    instrument.faults.add(parseFaultSpec("socket:fill-errors:nth=1"));
    EXPECT_FALSE(instrument.faults.strike(answer(FaultProtocol::Socket), 9)) << "the message itself goes as it is";
    timers.turn();
    EXPECT_EQ(client.serviceRequests, std::vector<std::uint8_t>{0x44});
    EXPECT_EQ(client.ask("SYST:ERR:COUN?\n"), "30\n");
    EXPECT_EQ(client.ask("SYST:ERR?\n"), "-310,\"System error\"\n");
    const std::string all = client.ask("SYST:ERR:ALL?\n");
    EXPECT_THAT(all, testing::EndsWith("-350,\"Queue overflow\"\n"));
}

} // namespace
