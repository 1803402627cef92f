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
 * One per process, on the user-interface thread. The first caller's parent owns it; destroying it allows a new one. It
 * must outlive the handlers that use it.
 *
 * The flag is one for all handlers: while an event for one of them is on its way, another one's wish is dropped and its
 * results wait for its next one.
 */
class VisaDispatcher : public QObject
{
    Q_OBJECT

public:
    static VisaDispatcher *getVisaDispatcherInstance(QObject *parent);
    ~VisaDispatcher() override;

    /// Worker and test threads: asks for a delivery, unless one is on its way already.
    void startWorking(VisaFunctionCallHandler *handler);
    /// To be called by a handler that ends: drops its event and ends a delivery that it is in the middle of.
    void forget(VisaFunctionCallHandler *handler);

protected:
    void customEvent(QEvent *event) override;

private:
    /// A delivery that has not returned. There are several while a listener runs an event loop of its own.
    struct Delivery {
        VisaFunctionCallHandler *handler; ///< null once the handler is gone
        Delivery *outer;
    };

    explicit VisaDispatcher(QObject *parent);

    static VisaDispatcher *m_staticThis;
    std::atomic<unsigned> m_eventPosted{0};                         ///< 1 while an event is on its way
    std::atomic<VisaFunctionCallHandler *> m_eventHandler{nullptr}; ///< the handler that this event carries
    Delivery *m_deliveries = nullptr;                               ///< innermost first
};
