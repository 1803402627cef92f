#include "log/Lock.h"

Lock::Lock(pthread_mutex_t mutex) : m_mutex(mutex)
{
    pthread_mutex_lock(&m_mutex);
}

Lock::~Lock()
{
    pthread_mutex_unlock(&m_mutex);
}
