#include "pipeline/VisaFunctionCallHandler.h"

#include "Asleep.h"
#include "RecordingListener.h"

#include <gmock/gmock.h>

#include <malloc.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <memory>
#include <new>
#include <thread>

using testing::ElementsAre;
using testing::IsEmpty;

namespace
{
class ResultRing : public testing::Test
{
protected:
    std::unique_ptr<VisaFunctionCallHandler> m_handler = std::make_unique<VisaFunctionCallHandler>(nullptr);

    void finish(VisaFunctionCallTyp type, std::uint64_t number = 0, const std::string &text = {})
    {
        _visaFunctionCall call = makeCall(type, number, text);
        m_handler->VisaFunctionCallFinshed(call);
    }
    std::vector<_VisaFunctionCallHandlerListener *> takeListeners()
    {
        std::vector<_VisaFunctionCallHandlerListener *> listeners;
        for (finsihedFunctionCall record; m_handler->getFinishedVisaFunctionCall(record);)
            listeners.push_back(record.listener);
        return listeners;
    }
};

TEST_F(ResultRing, GivesEachListenerAFullCopy)
{
    RecordingListener panel(m_handler.get(), VisaFunctionCallTyp::Read);
    RecordingListener label(m_handler.get(), VisaFunctionCallTyp::All);
    _visaFunctionCall call = makeCall(VisaFunctionCallTyp::Read, 5, std::string("x\0y", 3));
    call.status = -3;
    m_handler->VisaFunctionCallFinshed(call);
    EXPECT_EQ(call.parameter[0].stringValue, std::string("x\0y", 3));

    for (_VisaFunctionCallHandlerListener *expected :
         std::initializer_list<_VisaFunctionCallHandlerListener *>{&panel, &label}) {
        finsihedFunctionCall record;
        ASSERT_TRUE(m_handler->getFinishedVisaFunctionCall(record));
        EXPECT_EQ(record.listener, expected);
        EXPECT_EQ(record.call.type, VisaFunctionCallTyp::Read);
        EXPECT_EQ(record.call.status, -3);
        EXPECT_EQ(record.call.parameter[0].uintValue, 5u);
        EXPECT_EQ(record.call.parameter[0].stringValue, std::string("x\0y", 3));
    }
    finsihedFunctionCall none;
    EXPECT_FALSE(m_handler->getFinishedVisaFunctionCall(none));
}

TEST_F(ResultRing, AddressesListenersOfTheKindFirstThenThoseOfAll)
{
    RecordingListener all1(m_handler.get(), VisaFunctionCallTyp::All);
    RecordingListener open1(m_handler.get(), VisaFunctionCallTyp::Open);
    RecordingListener all2(m_handler.get(), VisaFunctionCallTyp::All);
    RecordingListener open2(m_handler.get(), VisaFunctionCallTyp::Open);
    RecordingListener close1(m_handler.get(), VisaFunctionCallTyp::Close);
    finish(VisaFunctionCallTyp::Open);
    EXPECT_THAT(takeListeners(), ElementsAre(&open1, &open2, &all1, &all2));
}

TEST_F(ResultRing, AListenerOfTheKindAndOfAllGetsTwoCopies)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Open);
    ASSERT_TRUE(listener.listenToType(VisaFunctionCallTyp::All));
    finish(VisaFunctionCallTyp::Open);
    EXPECT_THAT(takeListeners(), ElementsAre(&listener, &listener));
}

TEST_F(ResultRing, AFinishedCallOfAnUnknownKindReachesListenersOfAllOnly)
{
    RecordingListener all(m_handler.get(), VisaFunctionCallTyp::All);
    RecordingListener open(m_handler.get(), VisaFunctionCallTyp::Open);
    finish(VisaFunctionCallTyp::End);
    finish(static_cast<VisaFunctionCallTyp>(99));
    finish(static_cast<VisaFunctionCallTyp>(0xFFFFFFFF));
    EXPECT_THAT(takeListeners(), ElementsAre(&all, &all, &all));
}

TEST_F(ResultRing, ClosingDropsWhatWaitsAndWhatFollows)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    finish(VisaFunctionCallTyp::Read);
    m_handler->close();
    finish(VisaFunctionCallTyp::Read);
    EXPECT_EQ(m_handler->finishedCount(), 1u);
    EXPECT_THAT(takeListeners(), IsEmpty());
}

TEST_F(ResultRing, AProducerWaitsForRoomAfter4096Results)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    for (unsigned i = 0; i < 4096; ++i)
        finish(VisaFunctionCallTyp::Read, i);
    EXPECT_EQ(m_handler->finishedCount(), 4096u);

    std::atomic<bool> done{false};
    std::thread worker([&] {
        finish(VisaFunctionCallTyp::Read, 4096);
        done = true;
    });
    std::this_thread::sleep_for(std::chrono::milliseconds(50)); // no condition says "it waits"; too short hides nothing
    EXPECT_FALSE(done);
    for (unsigned i = 0; i <= 4096; ++i) {
        finsihedFunctionCall record;
        while (!m_handler->getFinishedVisaFunctionCall(record))
            std::this_thread::yield();
        ASSERT_EQ(record.call.parameter[0].uintValue, i);
    }
    worker.join();
    EXPECT_TRUE(done);
}

TEST_F(ResultRing, ALockSetWhileAProducerWaitsForRoomEndsWithItsResult)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    for (unsigned i = 0; i < 4096; ++i)
        finish(VisaFunctionCallTyp::Read, i);
    const auto request = makeCall(VisaFunctionCallTyp::Read);
    ASSERT_TRUE(m_handler->sendVisaFunctionCall(request, true));
    std::thread worker([&] { finish(VisaFunctionCallTyp::Read); });
    // The producer ends the lock before it waits, so that a request can set it once more.
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    bool sent = false;
    while (!(sent = m_handler->sendVisaFunctionCall(request, true)) && std::chrono::steady_clock::now() < deadline)
        std::this_thread::yield();
    EXPECT_TRUE(sent);
    finsihedFunctionCall record;
    EXPECT_TRUE(m_handler->getFinishedVisaFunctionCall(record));
    worker.join();
    EXPECT_TRUE(m_handler->sendVisaFunctionCall(request, true));
}

TEST_F(ResultRing, AProducerThatWaitsForRoomGivesUpWhenTheHandlerIsClosed)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    for (unsigned i = 0; i < 4096; ++i)
        finish(VisaFunctionCallTyp::Read, i);
    std::thread worker([&] { finish(VisaFunctionCallTyp::Read); });
    std::thread testThread([&] { finish(VisaFunctionCallTyp::Read); });
    m_handler->close();
    worker.join();
    testThread.join();
    EXPECT_EQ(m_handler->finishedCount(), 4096u);
}

TEST_F(ResultRing, ListenersComeAndGoWhileAProducerWaitsForRoom)
{
    RecordingListener stays(m_handler.get(), VisaFunctionCallTyp::Read);
    auto goes = std::make_unique<RecordingListener>(m_handler.get(), VisaFunctionCallTyp::Read);
    for (unsigned i = 0; i < 2048; ++i)
        finish(VisaFunctionCallTyp::Read, i);
    ASSERT_EQ(m_handler->finishedCount(), 4096u);
    std::thread worker([&] { finish(VisaFunctionCallTyp::Read, 2048); });
    finsihedFunctionCall first;
    ASSERT_TRUE(m_handler->getFinishedVisaFunctionCall(first));
    while (m_handler->finishedCount() < 4096)
        std::this_thread::yield();

    // The worker has served one of its two listeners and waits for room for the other one's copy. Neither of these waits
    // for the worker.
    const _VisaFunctionCallHandlerListener *gone = goes.get();
    goes.reset();
    RecordingListener comes(m_handler.get(), VisaFunctionCallTyp::Read);

    unsigned forStaying = 1;
    unsigned blank = 0;
    for (finsihedFunctionCall record; forStaying < 2049;) {
        if (!m_handler->getFinishedVisaFunctionCall(record)) {
            std::this_thread::yield();
            continue;
        }
        ASSERT_NE(record.listener, gone);
        forStaying += record.listener == &stays;
        blank += record.listener == nullptr;
    }
    worker.join();
    EXPECT_THAT(takeListeners(), IsEmpty()) << "a copy for the one that went";
    EXPECT_EQ(blank, 2048u);
}

TEST_F(ResultRing, DetachingBlanksTheCopiesThatWait)
{
    RecordingListener stays(m_handler.get(), VisaFunctionCallTyp::Read);
    {
        RecordingListener goes(m_handler.get(), VisaFunctionCallTyp::Read);
        finish(VisaFunctionCallTyp::Read);
        finish(VisaFunctionCallTyp::Read);
    }
    finish(VisaFunctionCallTyp::Read);
    EXPECT_THAT(takeListeners(), ElementsAre(&stays, nullptr, &stays, nullptr, &stays));
}

TEST_F(ResultRing, UnregisteringOneKindLeavesTheCopiesThatWait)
{
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    finish(VisaFunctionCallTyp::Read);
    EXPECT_TRUE(m_handler->removeVisaFunctionCallListener(&listener, VisaFunctionCallTyp::Read));
    finish(VisaFunctionCallTyp::Read);
    EXPECT_THAT(takeListeners(), ElementsAre(&listener));
}

TEST_F(ResultRing, ATakenResultLeavesNoMemoryBehind)
{
    // Records are reused: exchanging buffers with the ring would keep a large text in every slot that it passes.
    const auto inUse = [] {
        const auto info = mallinfo2();
        return info.uordblks + info.hblkhd;
    };
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    finsihedFunctionCall record;
    const auto before = inUse();
    for (int i = 0; i < 20; ++i) {
        finish(VisaFunctionCallTyp::Read, 0, std::string(1000000, 'x'));
        ASSERT_TRUE(m_handler->getFinishedVisaFunctionCall(record));
        ASSERT_EQ(record.call.parameter[0].stringValue.size(), 1000000u);
    }
    EXPECT_LT(inUse(), before + 3000000u);
}

TEST_F(ResultRing, TheThreadsOfWorkerAndTestsShareItInFullRecords)
{
    constexpr std::uint64_t Count = 10000;
    RecordingListener listener(m_handler.get(), VisaFunctionCallTyp::Read);
    RecordingListener label(m_handler.get(), VisaFunctionCallTyp::All);
    const auto produce = [&](VisaFunctionCallTyp type) {
        for (std::uint64_t i = 0; i < Count; ++i)
            finish(type, i, "a text too long to be kept inside the string itself");
    };
    std::thread worker(produce, VisaFunctionCallTyp::Read);
    std::thread testThread(produce, VisaFunctionCallTyp::StopTest);

    std::uint64_t nextRead = 0;
    std::uint64_t nextAll[2] = {0, 0};
    for (std::uint64_t taken = 0; taken < 3 * Count;) {
        finsihedFunctionCall record;
        if (!m_handler->getFinishedVisaFunctionCall(record)) {
            std::this_thread::yield();
            continue;
        }
        ++taken;
        ASSERT_EQ(record.call.parameter[0].stringValue, "a text too long to be kept inside the string itself");
        auto &next = record.listener == &listener ? nextRead : nextAll[record.call.type == VisaFunctionCallTyp::Read];
        ASSERT_EQ(record.call.parameter[0].uintValue, next);
        ++next;
    }
    worker.join();
    testThread.join();
    EXPECT_EQ(nextRead, Count);
    EXPECT_EQ(nextAll[0], Count);
    EXPECT_EQ(nextAll[1], Count);
}

TEST_F(ResultRing, ItsMutexServesTwoProcesses)
{
    void *memory =
        mmap(nullptr, sizeof(VisaFunctionCallHandler), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    ASSERT_NE(memory, MAP_FAILED);
    auto *handler = new (memory) VisaFunctionCallHandler(nullptr);
    {
        RecordingListener listener(handler, VisaFunctionCallTyp::Read);
        _visaFunctionCall call = makeCall(VisaFunctionCallTyp::Read);
        for (unsigned i = 0; i < 4096; ++i)
            handler->VisaFunctionCallFinshed(call);
        // This producer holds the mutex while it waits for room.
        handler->sendVisaFunctionCall(call, true);
        std::thread producer([&] {
            _visaFunctionCall own = makeCall(VisaFunctionCallTyp::Read);
            handler->VisaFunctionCallFinshed(own);
        });
        while (!handler->sendVisaFunctionCall(call, true)) // its first deed under the mutex ends the lock
            std::this_thread::yield();

        const pid_t child = fork();
        if (child == 0) {
            handler->VisaFunctionCallFinshed(call);
            _exit(0);
        }
        ASSERT_GT(child, 0);
        while (!isAsleep(child)) // waits for the mutex
            std::this_thread::yield();

        finsihedFunctionCall record;
        EXPECT_TRUE(handler->getFinishedVisaFunctionCall(record));
        EXPECT_TRUE(handler->getFinishedVisaFunctionCall(record));
        producer.join();
        int status = -1;
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
        pid_t ended = 0;
        while ((ended = waitpid(child, &status, WNOHANG)) == 0 && std::chrono::steady_clock::now() < deadline)
            std::this_thread::yield();
        if (ended == 0) {
            kill(child, SIGKILL);
            waitpid(child, &status, 0);
        }
        EXPECT_EQ(ended, child) << "the other process was never woken";
        EXPECT_EQ(handler->finishedCount(), 4096u);
    }
    handler->~VisaFunctionCallHandler();
    munmap(memory, sizeof(VisaFunctionCallHandler));
}
} // namespace
