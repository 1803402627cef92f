#pragma once

#include "pipeline/VisaFunctionCallListener.h"

#include <functional>
#include <vector>

/// Remembers what it hears, and can do something in the middle of it.
class RecordingListener final : public VisaFunctionCallListener
{
public:
    using VisaFunctionCallListener::sendVisaFunctionCall;
    using VisaFunctionCallListener::VisaFunctionCallListener;

    void visaFunctionCallFinished(_visaFunctionCall &call) override
    {
        finished.push_back(call);
        if (onFinished)
            onFinished(call);
    }

    void newVisaCallStarted(const VisaFunctionCallTyp &type) override
    {
        started.push_back(type);
        if (onStarted)
            onStarted();
    }

    VisaFunctionCallHandler *handler() const { return m_handler; }

    std::vector<_visaFunctionCall> finished;
    std::vector<VisaFunctionCallTyp> started;
    std::function<void(_visaFunctionCall &)> onFinished;
    std::function<void()> onStarted;
};

inline _visaFunctionCall makeCall(VisaFunctionCallTyp type, std::uint64_t number = 0, const std::string &text = {})
{
    _visaFunctionCall call;
    call.type = type;
    call.parameter[0] = {number, text};
    return call;
}
