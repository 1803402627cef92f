#pragma once

#include <algorithm>
#include <array>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <string>
#include <sys/syscall.h>
#include <thread>
#include <unistd.h>

namespace test
{

/// Whether thread @p id of this process sleeps in a system call that waits for something to happen. A thread that does so holds
/// no lock of the memory allocator.
inline bool threadWaits(const std::string &id)
{
    const std::string folder = "/proc/self/task/" + id;
    std::ifstream state(folder + "/stat");
    std::string line;
    std::getline(state, line);
    const std::size_t name = line.rfind(')');
    if (name == line.npos || name + 2 >= line.size() || line[name + 2] != 'S')
        return !state; // a thread that has ended in the meantime waits as well
    constexpr std::array<long, 16> Waits = {SYS_futex,  SYS_poll,     SYS_ppoll,           SYS_epoll_wait,
                                            SYS_read,   SYS_accept,   SYS_accept4,         SYS_recvfrom,
                                            SYS_select, SYS_recvmsg,  SYS_clock_nanosleep, SYS_nanosleep,
                                            SYS_pause,  SYS_pselect6, SYS_epoll_pwait,     SYS_wait4};
    long call = -1;
    return (std::ifstream(folder + "/syscall") >> call) && std::find(Waits.begin(), Waits.end(), call) != Waits.end();
}

/// Waits until that thread waits, 20 s at most.
inline void awaitWaiting(pid_t thread)
{
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    while (!threadWaits(std::to_string(thread)) && std::chrono::steady_clock::now() < deadline)
        std::this_thread::yield();
}

/**
 * fork(), once every other thread of the process waits. A child that is born while another thread allocates memory finds the
 * sanitizers' allocator locked for ever: they do not take care of that as the C library does. Gives up waiting after 20 s and
 * answers -1 as fork() does when it cannot.
 */
inline pid_t forkWhileOthersWait()
{
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    const std::string self = std::to_string(::gettid());
    while (std::chrono::steady_clock::now() < deadline) {
        bool quiet = true;
        for (const auto &thread : std::filesystem::directory_iterator("/proc/self/task"))
            quiet = quiet && (thread.path().filename() == self || threadWaits(thread.path().filename()));
        if (quiet)
            return ::fork();
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    return -1;
}

} // namespace test
