#include "panels/Subject.h"

void Subject::addObserver(Observer *observer)
{
    m_observers.append(observer);
    observer->update(this);
}

void Subject::removeObserver(Observer *observer)
{
    m_observers.removeOne(observer);
}

void Subject::notify()
{
    for (Observer *observer : qAsConst(m_observers))
        observer->update(this);
}
