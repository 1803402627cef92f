#pragma once

#include <QCoreApplication>
#include <QElapsedTimer>

#include <thread>

/// Runs the event loop until @p condition holds. False when that took longer than a generous limit.
template <typename Condition>
bool processEventsUntil(Condition condition, int limitMs = 30000)
{
    QElapsedTimer timer;
    timer.start();
    while (!condition()) {
        if (timer.hasExpired(limitMs))
            return false;
        QCoreApplication::processEvents(QEventLoop::AllEvents, 10);
        std::this_thread::yield();
    }
    return true;
}
