#pragma once

#include "pipeline/VisaFunctionCallListener.h"

#include <array>

class VisaFunctionCallParameter;

/// Builds one kind of request from up to three parameter sources and sends it.
class VisaFunctionCallCreator : public _VisaFunctionCallHandlerListener
{
public:
    explicit VisaFunctionCallCreator(VisaFunctionCallHandler *handler);

    /// Adds the source of the next slot (not owned; null leaves the slot empty). False when all three are set.
    bool setParameter(VisaFunctionCallParameter *parameter);
    void setType(VisaFunctionCallTyp type);
    void setLock(bool lock);

    /// False when a source refuses, in which case nothing is sent. True otherwise, also when the handler refuses the
    /// request.
    bool sendFunctionCall() const;

protected:
    ~VisaFunctionCallCreator() = default;

private:
    std::array<VisaFunctionCallParameter *, 3> m_parameters{};
    unsigned m_parameterCount = 0;
    VisaFunctionCallTyp m_type = VisaFunctionCallTyp::All;
    bool m_lockCall = true;
};
