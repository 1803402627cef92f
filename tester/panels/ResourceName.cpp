#include "panels/ResourceName.h"

#include "log/Lock.h"

ResourceName::ResourceName(unsigned long long id) : Data(id) {}

ResourceName::~ResourceName()
{
    pthread_mutex_destroy(&m_mutex);
}

void ResourceName::setName(const QString &name)
{
    const Lock lock(m_mutex);
    m_name = name;
    notify();
}

QString ResourceName::getName()
{
    const Lock lock(m_mutex);
    m_name.remove(QLatin1Char('\n'));
    return m_name;
}

QByteArray ResourceName::getData()
{
    const Lock lock(m_mutex);
    return m_name.toUtf8();
}

void ResourceName::setData(const QByteArray &data)
{
    const Lock lock(m_mutex);
    const auto length = qstrnlen(data.constData(), static_cast<uint>(data.size()));
    m_name = QString::fromLatin1(data.constData(), static_cast<int>(length));
    notify();
}
