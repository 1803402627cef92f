#pragma once

#include <QList>

class Subject;

/// Somebody who wants to know when a Subject changes.
class Observer
{
public:
    virtual void update(Subject *subject) = 0;

protected:
    ~Observer() = default;
};

/// Something whose changes are announced. Observers are not owned; adding one twice makes it hear everything twice.
class Subject
{
public:
    /// Appends @p observer and updates it at once, so that it starts with the current value.
    void addObserver(Observer *observer);
    /// Removes the first occurrence of @p observer, if any.
    void removeObserver(Observer *observer);
    void notify();

protected:
    ~Subject() = default;

private:
    QList<Observer *> m_observers;
};
