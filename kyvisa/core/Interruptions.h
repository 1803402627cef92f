#pragma once

#include "kyvisa/include/visa.h"

#include <atomic>

namespace kyvisa
{

/// What other threads may do to the calls of a session: end it for good, or end what is going on.
struct Interruptions {
    std::atomic<bool> closing{false};
    std::atomic<unsigned> terminations{0};
};

/**
 * One call's view of them, made when the call begins: a viTerminate that came before does not concern it.
 */
class CallWatch
{
public:
    explicit CallWatch(const Interruptions &interruptions)
        : m_interruptions(interruptions), m_before(interruptions.terminations.load())
    {
    }

    /// VI_SUCCESS as long as the call may go on.
    ViStatus status() const
    {
        if (m_interruptions.closing.load())
            return VI_ERROR_INV_OBJECT;
        return m_interruptions.terminations.load() != m_before ? VI_ERROR_ABORT : VI_SUCCESS;
    }
    bool interrupted() const { return status() != VI_SUCCESS; }

private:
    const Interruptions &m_interruptions;
    const unsigned m_before;
};

} // namespace kyvisa
