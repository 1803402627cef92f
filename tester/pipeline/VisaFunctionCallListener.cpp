#include "pipeline/VisaFunctionCallListener.h"

#include "pipeline/VisaFunctionCallHandler.h"

#include <utility>

_VisaFunctionCallHandlerListener::_VisaFunctionCallHandlerListener(VisaFunctionCallHandler *handler)
    : m_handler(handler)
{
    if (m_handler)
        m_handler->addVisaFunctionCallHandlerListener(this);
}

_VisaFunctionCallHandlerListener::~_VisaFunctionCallHandlerListener()
{
    if (m_handler)
        m_handler->removeVisaFunctionCallHandlerListener(this);
}

void _VisaFunctionCallHandlerListener::setVisaFunctionCallHandler(VisaFunctionCallHandler *handler)
{
    if (m_handler)
        m_handler->removeVisaFunctionCallHandlerListener(this);
    m_handler = handler;
    if (m_handler)
        m_handler->addVisaFunctionCallHandlerListener(this);
}

void _VisaFunctionCallHandlerListener::removeHandler()
{
    // Whoever calls this: the handler must not keep a pointer that nobody will take back.
    if (VisaFunctionCallHandler *handler = std::exchange(m_handler, nullptr))
        handler->forgetListener(this);
}

VisaFunctionCallListener::VisaFunctionCallListener(VisaFunctionCallHandler *handler, VisaFunctionCallTyp type)
    : _VisaFunctionCallHandlerListener(handler)
{
    if (!m_handler || m_handler->addVisaFunctionCallListener(this, type))
        m_types.push_back(type);
}

VisaFunctionCallListener::~VisaFunctionCallListener()
{
    unregister();
}

void VisaFunctionCallListener::setVisaFunctionCallHandler(VisaFunctionCallHandler *handler)
{
    _VisaFunctionCallHandlerListener::setVisaFunctionCallHandler(handler);
    if (!m_handler)
        return;
    for (const VisaFunctionCallTyp type : m_types)
        m_handler->addVisaFunctionCallListener(this, type);
}

void VisaFunctionCallListener::removeHandler()
{
    unregister();
    _VisaFunctionCallHandlerListener::removeHandler();
}

void VisaFunctionCallListener::unregister()
{
    if (!m_handler)
        return;
    for (const VisaFunctionCallTyp type : m_types)
        m_handler->removeVisaFunctionCallListener(this, type);
}

void VisaFunctionCallListener::newVisaCallStarted(const VisaFunctionCallTyp &) {}

bool VisaFunctionCallListener::listenToType(VisaFunctionCallTyp type)
{
    if (!m_handler || !m_handler->addVisaFunctionCallListener(this, type))
        return false;
    m_types.push_back(type);
    return true;
}

bool VisaFunctionCallListener::sendVisaFunctionCall(_visaFunctionCall &call)
{
    return m_handler && m_handler->sendVisaFunctionCall(call, false);
}
