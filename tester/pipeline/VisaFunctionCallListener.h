#pragma once

#include "pipeline/VisaFunctionCall.h"

#include <vector>

class VisaFunctionCallHandler;

/// Base of everything that is attached to a handler.
class _VisaFunctionCallHandlerListener
{
public:
    virtual void setVisaFunctionCallHandler(VisaFunctionCallHandler *handler);
    /// Forgets the handler. Called by the handler, also when it ends first.
    virtual void removeHandler();

protected:
    explicit _VisaFunctionCallHandlerListener(VisaFunctionCallHandler *handler);
    ~_VisaFunctionCallHandlerListener();
    _VisaFunctionCallHandlerListener(const _VisaFunctionCallHandlerListener &) = delete;
    _VisaFunctionCallHandlerListener &operator=(const _VisaFunctionCallHandlerListener &) = delete;

    VisaFunctionCallHandler *m_handler = nullptr; ///< not owned, may be null
};

/**
 * Receives finished calls of the kinds it registered for, on the user-interface thread.
 *
 *     class Panel : public QWidget, public VisaFunctionCallListener {
 *         Panel(VisaFunctionCallHandler *handler) : VisaFunctionCallListener(handler, VisaFunctionCallTyp::Open)
 *         { listenToType(VisaFunctionCallTyp::Close); }
 *         void visaFunctionCallFinished(_visaFunctionCall &call) override;
 *     };
 */
class VisaFunctionCallListener : public _VisaFunctionCallHandlerListener
{
public:
    /// Registers for @p type at once, or as soon as a handler is set when @p handler is null.
    VisaFunctionCallListener(VisaFunctionCallHandler *handler, VisaFunctionCallTyp type);

    void setVisaFunctionCallHandler(VisaFunctionCallHandler *handler) override;
    void removeHandler() override;
    virtual void visaFunctionCallFinished(_visaFunctionCall &call) = 0;
    /// A call was queued. Reaches listeners of All only.
    virtual void newVisaCallStarted(const VisaFunctionCallTyp &type);

    /// Registers for one more kind. False without a handler or when the registration fails.
    bool listenToType(VisaFunctionCallTyp type);
    /// Sends a follow-up request; it neither waits for the lock flag nor keeps it set.
    bool sendVisaFunctionCall(_visaFunctionCall &call);

protected:
    ~VisaFunctionCallListener();

private:
    void unregister();

    std::vector<VisaFunctionCallTyp> m_types; ///< in order; kept without a handler, for the next one
};
