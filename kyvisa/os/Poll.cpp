#include "kyvisa/os/Poll.h"

#include "kyvisa/os/SystemCalls.h"

#include <cerrno>

namespace kyvisa::os
{

IoResult pollWithin(std::span<pollfd> watched, const WaitLimit &limit, Deadline atLatest)
{
    pollfd &wakeup = watched.back();
    wakeup = {limit.wakeup.descriptor(), POLLIN, 0};
    const Deadline until = limit.deadline.orEarlier(atLatest);
    for (;;) {
        if (limit.wakeup.raised())
            return IoResult::Woken;
        timespec left{};
        if (!until.isNever()) {
            const auto remaining = until.remaining();
            left.tv_sec = static_cast<time_t>(remaining.count() / 1'000'000'000);
            left.tv_nsec = static_cast<long>(remaining.count() % 1'000'000'000);
        }
        const int ready = systemCalls().poll(watched.data(), watched.size(), until.isNever() ? nullptr : &left);
        if (ready < 0) {
            if (errno != EINTR)
                return IoResult::NoMemory;
            continue;
        }
        if (wakeup.revents != 0) {
            limit.wakeup.forgetStaleSignal();
            if (limit.wakeup.raised())
                return IoResult::Woken;
            if (ready == 1)
                continue;
        }
        if (ready > 0)
            return IoResult::Done;
        if (limit.deadline.expired())
            return IoResult::TimedOut;
        if (atLatest.expired())
            return IoResult::Done;
    }
}

} // namespace kyvisa::os
