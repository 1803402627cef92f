#pragma once

#include <QEvent>
#include <QObject>

#include <atomic>

class VisaFunctionCallHandler;

/// Says that results wait in a handler. Posted to the dispatcher, owned by Qt's event loop.
class VisaFunctionCallEvent : public QEvent
{
public:
    static constexpr int EventType = 5000;

    explicit VisaFunctionCallEvent(VisaFunctionCallHandler *handler);

    VisaFunctionCallHandler *getVisaFunctionCallHandler() const { return m_handler; }

private:
    VisaFunctionCallHandler *m_handler;
};

/**
 * Brings results to the user-interface thread: any number of waiting results costs one posted event.
 *
 * One per process. The first caller's parent owns it; destroying it allows a new one.
 */
class VisaDispatcher : public QObject
{
    Q_OBJECT

public:
    static VisaDispatcher *getVisaDispatcherInstance(QObject *parent);
    ~VisaDispatcher() override;

    /// Worker and test threads: asks for a delivery, unless one is on its way already.
    void startWorking(VisaFunctionCallHandler *handler);

protected:
    void customEvent(QEvent *event) override;

private:
    explicit VisaDispatcher(QObject *parent);

    static VisaDispatcher *m_staticThis;
    std::atomic<unsigned> m_eventPosted{0}; ///< 1 while an event is on its way
};
