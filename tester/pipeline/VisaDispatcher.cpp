#include "pipeline/VisaDispatcher.h"

#include "pipeline/VisaFunctionCallHandler.h"
#include "pipeline/VisaFunctionCallListener.h"

#include <QCoreApplication>

VisaDispatcher *VisaDispatcher::m_staticThis = nullptr;

VisaFunctionCallEvent::VisaFunctionCallEvent(VisaFunctionCallHandler *handler)
    : QEvent(static_cast<QEvent::Type>(EventType)), m_handler(handler)
{
}

VisaDispatcher *VisaDispatcher::getVisaDispatcherInstance(QObject *parent)
{
    if (!m_staticThis)
        m_staticThis = new VisaDispatcher(parent);
    return m_staticThis;
}

VisaDispatcher::VisaDispatcher(QObject *parent) : QObject(parent) {}

VisaDispatcher::~VisaDispatcher()
{
    m_staticThis = nullptr;
}

void VisaDispatcher::startWorking(VisaFunctionCallHandler *handler)
{
    unsigned none = 0;
    if (!m_eventPosted.compare_exchange_strong(none, 1))
        return;
    m_eventHandler.store(handler);
    QCoreApplication::postEvent(this, new VisaFunctionCallEvent(handler));
}

void VisaDispatcher::customEvent(QEvent *event)
{
    // Nobody posts any other custom event to a dispatcher.
    VisaFunctionCallHandler *handler = static_cast<VisaFunctionCallEvent *>(event)->getVisaFunctionCallHandler();
    m_eventHandler.store(nullptr);
    m_eventPosted.exchange(0);
    if (!handler)
        return;

    Delivery delivery{handler, m_deliveries};
    m_deliveries = &delivery;
    // Only what waits now: whatever comes later has asked for the next event, and the window stays alive in between.
    finsihedFunctionCall record;
    for (unsigned waiting = handler->finishedCount(); waiting > 0; --waiting) {
        if (!delivery.handler || !delivery.handler->getFinishedVisaFunctionCall(record))
            break;
        if (auto *listener = dynamic_cast<VisaFunctionCallListener *>(record.listener))
            listener->visaFunctionCallFinished(record.call);
    }
    m_deliveries = delivery.outer;
}

void VisaDispatcher::forget(VisaFunctionCallHandler *handler)
{
    for (Delivery *delivery = m_deliveries; delivery; delivery = delivery->outer) {
        if (delivery->handler == handler)
            delivery->handler = nullptr;
    }
    // At most one event is on its way; another handler's must stay.
    VisaFunctionCallHandler *carried = handler;
    if (m_eventHandler.compare_exchange_strong(carried, nullptr)) {
        QCoreApplication::removePostedEvents(this, VisaFunctionCallEvent::EventType);
        m_eventPosted.store(0);
    }
}
