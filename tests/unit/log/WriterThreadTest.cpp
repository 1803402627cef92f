#include "TemporaryHome.h"

#include "log/Log.h"
#include "log/LogFile.h"
#include "log/SessionLog.h"

#include <pthread.h>

#include <algorithm>
#include <chrono>
#include <thread>

namespace
{

class WriterThread : public TemporaryHome
{
protected:
    void start() { ASSERT_EQ(pthread_create(&m_thread, nullptr, ThreadForFileLog, m_log.get()), 0); }
    void join()
    {
        void *result = this;
        ASSERT_EQ(pthread_join(m_thread, &result), 0);
        EXPECT_EQ(result, nullptr);
    }

    LogFile m_file{nullptr};
    const std::unique_ptr<Log> m_log = std::make_unique<Log>(&m_file);
    SessionLog m_session{m_log.get(), nullptr};
    pthread_t m_thread{};
};

TEST_F(WriterThread, WritesWhatWasEmittedAndTheEmittingThreadTouchesNoFile)
{
    m_session.writeLogFile(true);
    FastBuffer emitted = line(0, "viClear(vi= 1)", 0, 15230);
    m_session.emitWriteMessage(&emitted);
    EXPECT_EQ(contentOf(m_file.getCurrentFileName()), "");

    start();
    const std::string expected = std::to_string(emitted.line) + "\tVI_SUCCESS\tviClear(vi= 1)\t15230 nsec\n";
    for (int i = 0; i < 20000 && contentOf(m_file.getCurrentFileName()) != expected; ++i)
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    EXPECT_EQ(contentOf(m_file.getCurrentFileName()), expected);
    m_log->stop();
    join();
}

TEST_F(WriterThread, EndsWhenTheLogIsStoppedWhileItWaits)
{
    start();
    m_log->stop();
    join();
}

TEST_F(WriterThread, DoesNotWriteLinesThatStillWaitWhenTheLogIsStopped)
{
    m_session.writeLogFile(true);
    FastBuffer emitted = line(0, "too late");
    for (int i = 0; i < 3; ++i)
        m_session.emitWriteMessage(&emitted);
    m_log->stop();
    start();
    join();
    EXPECT_EQ(contentOf(m_file.getCurrentFileName()), "");
}

TEST_F(WriterThread, KeepsTheProducerWaitingRatherThanDroppingALine)
{
    m_session.writeLogFile(true);
    start();
    FastBuffer emitted = line(0, "x");
    for (int i = 0; i < 40000; ++i)
        m_session.emitWriteMessage(&emitted);
    const QString path = m_file.getCurrentFileName();
    for (int i = 0; i < 20000 && contentOf(path).find(std::to_string(emitted.line) + "\t") == std::string::npos; ++i)
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    m_log->stop();
    join();
    const std::string content = contentOf(path);
    EXPECT_EQ(std::count(content.begin(), content.end(), '\n'), 40000);
}

TEST_F(WriterThread, DropsLinesQuietlyWithoutALogFile)
{
    const auto log = std::make_unique<Log>(nullptr);
    FastBuffer pushed{};
    pthread_t thread{};
    ASSERT_EQ(pthread_create(&thread, nullptr, ThreadForFileLog, log.get()), 0);
    for (int i = 0; i < 20000; ++i)
        log->getFileMessageQueue()->push(pushed);
    log->stop();
    EXPECT_EQ(pthread_join(thread, nullptr), 0);
}

} // namespace
