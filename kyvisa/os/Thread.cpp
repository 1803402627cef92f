#include "kyvisa/os/Thread.h"

namespace kyvisa::os
{

SignalsBlocked::SignalsBlocked()
{
    sigset_t all;
    ::sigfillset(&all);
    ::pthread_sigmask(SIG_SETMASK, &all, &m_before);
}

SignalsBlocked::~SignalsBlocked()
{
    ::pthread_sigmask(SIG_SETMASK, &m_before, nullptr);
}

} // namespace kyvisa::os
