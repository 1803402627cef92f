#include "kyvisa/os/Wakeup.h"

#include "kyvisa/os/SystemCalls.h"

#include <cstdint>
#include <sys/eventfd.h>
#include <unistd.h>
#include <utility>

namespace kyvisa::os
{

Wakeup::Wakeup() : m_descriptor(systemCalls().eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {}

Wakeup::~Wakeup()
{
    abandon();
}

void Wakeup::abandon()
{
    if (valid())
        systemCalls().close(std::exchange(m_descriptor, -1));
}

void Wakeup::signal() const
{
    if (valid())
        ::eventfd_write(m_descriptor, 1);
}

void Wakeup::terminate()
{
    m_terminated.store(true, std::memory_order_release);
    signal();
}

void Wakeup::close()
{
    m_closed.store(true, std::memory_order_release);
    signal();
}

void Wakeup::rearm()
{
    if (m_terminated.load(std::memory_order_acquire))
        m_terminated.store(false, std::memory_order_release);
}

void Wakeup::forgetStaleSignal() const
{
    if (raised())
        return;
    std::uint64_t count;
    ::eventfd_read(m_descriptor, &count);
    // A reason that came between the two lines above has lost its signal; others may be waiting for it.
    if (raised())
        signal();
}

} // namespace kyvisa::os
