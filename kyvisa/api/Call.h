#pragma once

#include "kyvisa/api/Entry.h"
#include "kyvisa/core/Trace.h"
#include "kyvisa/include/visatype.h"
#include "kyvisa/os/Stopwatch.h"

#include <string>
#include <tuple>
#include <type_traits>

namespace kyvisa::api
{

/// How arguments appear in the trace of a call, beside plain numbers and texts.
struct Bytes {
    const void *data;
    ViUInt32 count;
};
/// What was read: as many bytes as the call says that it has transferred.
struct Received {
    const void *data;
    const ViUInt32 *count;
};
/// A place for a result. What it holds is shown when the call succeeded.
template <typename Number>
struct Out {
    Number *place;
};
template <typename Number>
Out(Number *) -> Out<Number>;
/// An address that is shown as such.
struct Address {
    const void *value;
};
struct OutText {
    const ViChar *place;
};

/**
 * One call of an exported function: where its work is done, and its line in the trace that Debug = 1 in the configuration
 * file asks for. Without the trace it costs one look at a flag.
 *
 *     return Call("viRead", vi, Received{buf, retCnt}, cnt, Out{retCnt}).onInstrument(vi, work);
 */
template <typename... Arguments>
class Call
{
public:
    explicit Call(const char *operation, Arguments... arguments) : m_operation(operation), m_arguments(arguments...)
    {
        if (trace::isOn())
            m_stopwatch.start();
    }

    /// For the call that may switch the trace on: what it has taken is known all the same.
    Call &timed()
    {
        m_stopwatch.start();
        return *this;
    }

    template <typename Work>
    ViStatus on(ViObject handle, const Work &work) const noexcept
    {
        return ended(onObject(handle, work));
    }
    /// @param otherwise what any other object answers.
    template <typename Work>
    ViStatus onInstrument(ViSession handle, const Work &work, ViStatus otherwise = VI_ERROR_NSUP_OPER) const noexcept
    {
        return ended(api::onInstrument(handle, m_operation, work, otherwise));
    }
    template <typename Work>
    ViStatus onResourceManager(ViSession handle, const Work &work) const noexcept
    {
        return ended(api::onResourceManager(handle, work));
    }
    template <typename Work>
    ViStatus anywhere(const Work &work) const noexcept
    {
        return ended(guarded(work));
    }

private:
    ViStatus ended(ViStatus status) const noexcept
    {
        if (trace::isOn())
            tell(status);
        return status;
    }

    void tell(ViStatus status) const noexcept
    {
        try {
            std::string text;
            std::apply(
                [&](const Arguments &...arguments) {
                    ((text += text.empty() ? "" : ", ", append(text, status, arguments)), ...);
                },
                m_arguments);
            trace::write(m_operation, text, status, m_stopwatch.elapsed());
        } catch (...) {
            // A trace that cannot be had is no reason for the call to fail.
        }
    }

    template <typename Number>
    static void append(std::string &text, ViStatus, Number number) requires std::is_integral_v<Number>
    {
        text += std::to_string(number);
    }
    static void append(std::string &text, ViStatus, const char *string) { trace::appendText(text, string); }
    static void append(std::string &text, ViStatus, Address address) { trace::appendAddress(text, address.value); }
    static void append(std::string &text, ViStatus, Bytes bytes) { trace::appendBytes(text, bytes.data, bytes.count); }
    static void append(std::string &text, ViStatus, Received received)
    {
        if (received.count)
            trace::appendBytes(text, received.data, *received.count);
        else
            trace::appendAddress(text, received.data);
    }
    template <typename Number>
    static void append(std::string &text, ViStatus status, Out<Number> out)
    {
        if (out.place && status >= 0)
            text += std::to_string(*out.place);
        else
            trace::appendAddress(text, out.place);
    }
    static void append(std::string &text, ViStatus status, OutText out)
    {
        if (out.place && status >= 0)
            trace::appendText(text, out.place);
        else
            trace::appendAddress(text, out.place);
    }

    const char *const m_operation;
    const std::tuple<Arguments...> m_arguments;
    os::Stopwatch m_stopwatch;
};

/// For operations that no session of this library lists.
inline ViStatus unsupported(ViSession handle, const char *operation) noexcept
{
    return Call(operation, handle).onInstrument(handle, [](InstrumentSession &) { return VI_ERROR_NSUP_OPER; });
}

} // namespace kyvisa::api
