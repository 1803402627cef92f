#pragma once

#include <pthread.h>

/**
 * A guard that locks a copy of the mutex it is given, from construction to destruction.
 *
 * It therefore excludes nobody who locks the original. ResourceName depends on that: it notifies its observers inside the
 * guard, and they ask it for its name, which takes the guard again on the same thread. The original is never locked
 * itself: a copy of a locked mutex would be locked for ever.
 */
class Lock
{
public:
    explicit Lock(pthread_mutex_t mutex);
    ~Lock();
    Lock(const Lock &) = delete;
    Lock &operator=(const Lock &) = delete;

private:
    pthread_mutex_t m_mutex;
};
