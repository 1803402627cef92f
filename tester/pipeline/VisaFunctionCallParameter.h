#pragma once

#include "pipeline/VisaFunctionCall.h"

/// A source of one request slot: every input widget of the panels is one.
class VisaFunctionCallParameter
{
public:
    /// Fills @p parameter from the current content. False cancels the call that asked.
    virtual bool getParameter(Parameter &parameter) = 0;

protected:
    ~VisaFunctionCallParameter() = default; // owners delete through the concrete type
};

/// A source that simply holds a value.
class VisaFunctionCallParameterValue final : public VisaFunctionCallParameter
{
public:
    VisaFunctionCallParameterValue() = default;
    explicit VisaFunctionCallParameterValue(Parameter &value) : m_value(value) {}

    bool getParameter(Parameter &parameter) override;
    bool setParameterValue(const Parameter &value);
    bool setParameterValueUInt(unsigned long long value);
    bool setParameterValueString(const std::string &value);
    /// Empties the text and leaves the number as it is.
    void clear();

private:
    Parameter m_value;
};
