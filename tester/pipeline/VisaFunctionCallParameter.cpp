#include "pipeline/VisaFunctionCallParameter.h"

bool VisaFunctionCallParameterValue::getParameter(Parameter &parameter)
{
    parameter = m_value;
    return true;
}

bool VisaFunctionCallParameterValue::setParameterValue(const Parameter &value)
{
    m_value = value;
    return true;
}

bool VisaFunctionCallParameterValue::setParameterValueUInt(unsigned long long value)
{
    m_value.uintValue = value;
    return true;
}

bool VisaFunctionCallParameterValue::setParameterValueString(const std::string &value)
{
    m_value.stringValue = value;
    return true;
}

void VisaFunctionCallParameterValue::clear()
{
    m_value.stringValue.clear();
}
