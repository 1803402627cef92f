#pragma once

#include "app/Data.h"
#include "panels/Subject.h"

#include <QString>

#include <pthread.h>

/**
 * The resource string of a session: observed by the line edit that shows it, kept from one run to the next.
 *
 * Every operation runs inside a Lock on m_mutex, the notification of the observers included. An observer asks for the
 * name while it is being notified; that does not deadlock only because Lock locks a copy of the mutex, and it is why the
 * member itself is never locked: the copy of a locked mutex would wait for ever. An observer must not call back from
 * another thread.
 */
class ResourceName : public Subject, public Data
{
public:
    explicit ResourceName(unsigned long long id);
    ~ResourceName();
    ResourceName(const ResourceName &) = delete;
    ResourceName &operator=(const ResourceName &) = delete;

    void setName(const QString &name);
    /// Removes line breaks from the stored name, then returns it.
    QString getName();

    /// UTF-8.
    QByteArray getData() override;
    /// Latin-1, up to the first zero byte.
    void setData(const QByteArray &data) override;

private:
    QString m_name;
    pthread_mutex_t m_mutex = PTHREAD_MUTEX_INITIALIZER;
};
