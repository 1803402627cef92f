#pragma once

#include <csignal>
#include <thread>
#include <utility>

namespace kyvisa::os
{

/// Blocks all signals on this thread for its life time. A thread that is started meanwhile keeps them blocked.
class SignalsBlocked
{
public:
    SignalsBlocked();
    ~SignalsBlocked();
    SignalsBlocked(const SignalsBlocked &) = delete;
    SignalsBlocked &operator=(const SignalsBlocked &) = delete;

private:
    sigset_t m_before;
};

/// Starts a thread that takes no signals: those of the process belong to its own threads. Throws std::system_error.
template <typename Function>
std::thread startThread(Function function)
{
    const SignalsBlocked blocked;
    return std::thread(std::move(function));
}

} // namespace kyvisa::os
