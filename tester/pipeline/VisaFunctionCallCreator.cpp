#include "pipeline/VisaFunctionCallCreator.h"

#include "pipeline/VisaFunctionCallHandler.h"
#include "pipeline/VisaFunctionCallParameter.h"

VisaFunctionCallCreator::VisaFunctionCallCreator(VisaFunctionCallHandler *handler)
    : _VisaFunctionCallHandlerListener(handler)
{
}

bool VisaFunctionCallCreator::setParameter(VisaFunctionCallParameter *parameter)
{
    if (m_parameterCount >= m_parameters.size())
        return false;
    m_parameters[m_parameterCount++] = parameter;
    return true;
}

void VisaFunctionCallCreator::setType(VisaFunctionCallTyp type)
{
    m_type = type;
}

void VisaFunctionCallCreator::setLock(bool lock)
{
    m_lockCall = lock;
}

bool VisaFunctionCallCreator::sendFunctionCall() const
{
    _visaFunctionCall request;
    request.type = m_type;
    if (!m_handler)
        return true;
    for (unsigned i = 0; i < m_parameterCount; ++i) {
        if (m_parameters[i] && !m_parameters[i]->getParameter(request.parameter[i]))
            return false;
    }
    m_handler->sendVisaFunctionCall(request, m_lockCall);
    return true;
}
