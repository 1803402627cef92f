#include "simulator/instrument/LockTable.h"

#include "unit/simulator/HandTurnedTimers.h"

#include <gtest/gtest.h>

#include <optional>

using namespace simulator;
using namespace std::chrono_literals;
using Answer = LockTable::Answer;
using Released = LockTable::Released;

namespace
{

class Locks : public testing::Test
{
protected:
    /// The answer so far, if any.
    std::optional<Answer> &request(LockTable::Owner owner, const std::string &key,
                                   std::chrono::milliseconds timeout = 0ms)
    {
        std::optional<Answer> &answer = answers.emplace_back();
        table.request(owner, key, timeout, [&answer](Answer value) { answer = value; });
        return answer;
    }

    HandTurnedTimers timers;
    LockTable table{timers};
    int changes = 0;
    LockTable::Owner a = table.join([this] { ++changes; });
    LockTable::Owner b = table.join([] {});
    LockTable::Owner c = table.join([] {});
    std::list<std::optional<Answer>> answers;
};

} // namespace

TEST_F(Locks, ShutOutEverybodyElseWhenExclusive)
{
    EXPECT_TRUE(table.allows(a));
    EXPECT_EQ(request(a, ""), Answer::Granted);
    EXPECT_TRUE(table.allows(a));
    EXPECT_FALSE(table.allows(b));
    EXPECT_TRUE(table.exclusivelyLocked());
    EXPECT_EQ(table.holders(), 1u);
    EXPECT_EQ(request(b, ""), Answer::Failed);
    EXPECT_EQ(request(b, "key"), Answer::Failed);
    EXPECT_EQ(table.release(a), Released::Exclusive);
    EXPECT_TRUE(table.allows(b));
}

TEST_F(Locks, AreSharedByTheSameKeyOnly)
{
    EXPECT_EQ(request(a, "key"), Answer::Granted);
    EXPECT_EQ(request(b, "key"), Answer::Granted);
    EXPECT_EQ(request(c, "other"), Answer::Failed);
    EXPECT_EQ(request(c, ""), Answer::Failed);
    EXPECT_TRUE(table.allows(b));
    EXPECT_FALSE(table.allows(c));
    EXPECT_FALSE(table.exclusivelyLocked());
    EXPECT_EQ(table.holders(), 2u);
    EXPECT_EQ(table.release(a), Released::Shared);
    EXPECT_FALSE(table.allows(c));
    EXPECT_EQ(table.release(b), Released::Shared);
    EXPECT_TRUE(table.allows(c));
    EXPECT_EQ(request(c, "other"), Answer::Granted);
}

TEST_F(Locks, LetASharerTakeTheExclusiveOneOnTop)
{
    request(a, "key");
    request(b, "key");
    EXPECT_EQ(request(a, ""), Answer::Granted);
    EXPECT_FALSE(table.allows(b)) << "the other sharer is shut out";
    EXPECT_EQ(table.holders(), 2u) << "who holds both counts once";
    EXPECT_EQ(request(b, ""), Answer::Failed);
    EXPECT_EQ(request(c, "key"), Answer::Failed) << "nobody joins meanwhile";
    EXPECT_EQ(table.release(a), Released::Exclusive) << "the exclusive one goes first";
    EXPECT_TRUE(table.allows(b));
    EXPECT_EQ(table.release(a), Released::Shared);
    EXPECT_EQ(table.release(a), Released::Nothing);
}

TEST_F(Locks, RefuseWhatIsHeldAlready)
{
    request(a, "");
    EXPECT_EQ(request(a, ""), Answer::Error);
    EXPECT_EQ(request(a, "key"), Answer::Error) << "no shared one below an exclusive one";
    table.release(a);
    request(a, "key");
    EXPECT_EQ(request(a, "key"), Answer::Error);
    EXPECT_EQ(request(a, "other"), Answer::Error);
}

TEST_F(Locks, AreNotForANewcomerWhileSomebodyWaits)
{
    request(a, "");
    auto &first = request(b, "", 1000ms);
    table.release(a);
    EXPECT_EQ(request(c, ""), Answer::Failed);
    EXPECT_EQ(request(c, "key"), Answer::Failed);
    timers.turn();
    EXPECT_EQ(first, Answer::Granted);
}

TEST_F(Locks, AreForANewcomerWhoSharesWithThoseWhoWait)
{
    request(a, "");
    auto &first = request(b, "key", 1000ms);
    table.release(a);
    EXPECT_EQ(request(c, "key"), Answer::Granted);
    timers.turn();
    EXPECT_EQ(first, Answer::Granted);
}

TEST_F(Locks, GoToTheNextInLineWhenReleased)
{
    request(a, "");
    auto &first = request(b, "", 1000ms);
    auto &second = request(c, "", 1000ms);
    EXPECT_FALSE(first.has_value());
    table.release(a);
    timers.turn();
    EXPECT_EQ(first, Answer::Granted);
    EXPECT_FALSE(second.has_value());
    table.leave(b);
    timers.turn();
    EXPECT_EQ(second, Answer::Granted);
}

TEST_F(Locks, AreGivenToAllWaitingSharersAtOnce)
{
    request(a, "");
    auto &first = request(b, "key", 1000ms);
    auto &second = request(c, "key", 1000ms);
    table.release(a);
    timers.turn();
    EXPECT_EQ(first, Answer::Granted);
    EXPECT_EQ(second, Answer::Granted);
}

TEST_F(Locks, FailWhenTheTimeIsOver)
{
    request(a, "");
    auto &answer = request(b, "", 100ms);
    timers.turn(99ms);
    EXPECT_FALSE(answer.has_value());
    timers.turn(1ms);
    EXPECT_EQ(answer, Answer::Failed);
    table.release(a);
    timers.turn();
    EXPECT_TRUE(table.allows(c)) << "nobody got it behind its back";
}

TEST_F(Locks, AnswerAWaitThatIsEnded)
{
    request(a, "");
    auto &answer = request(b, "", 100ms);
    EXPECT_EQ(request(b, "", 100ms), Answer::Error) << "one request at a time";
    table.endWait(b);
    EXPECT_EQ(answer, Answer::Failed);
    EXPECT_EQ(timers.waiting(), 0u);
}

TEST_F(Locks, AreFreeWhenTheirHolderLeaves)
{
    request(a, "key");
    request(a, "");
    auto &forgotten = request(b, "", 1000ms);
    table.leave(b);
    table.leave(a);
    timers.turn(2000ms);
    EXPECT_FALSE(forgotten.has_value());
    EXPECT_EQ(table.holders(), 0u);
    EXPECT_TRUE(table.allows(c));
}

TEST_F(Locks, TellTheOthersOfAChangeFromATimerOnly)
{
    request(b, "");
    table.release(b);
    EXPECT_EQ(changes, 0);
    timers.turn();
    EXPECT_EQ(changes, 1);
}
