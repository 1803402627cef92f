#pragma once

#include <chrono>
#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <thread>

// For programs that are tests by themselves: what does not hold is told, and ends the program with status 1.
#define CHECK(condition)           ((condition) ? void() : host::failed(__FILE__, __LINE__, #condition))
#define CHECK_STATUS(call, wanted) host::checkStatus(__FILE__, __LINE__, #call, call, wanted)

namespace host
{

[[noreturn]] inline void failed(const char *file, int line, const char *what)
{
    std::fprintf(stderr, "%s:%d: %s does not hold\n", file, line, what);
    std::fflush(stderr);
    std::_Exit(1);
}

inline void checkStatus(const char *file, int line, const char *call, long got, long wanted)
{
    if (static_cast<unsigned>(got) == static_cast<unsigned>(wanted))
        return;
    std::fprintf(stderr, "%s:%d: %s is %08X and not %08X\n", file, line, call, static_cast<unsigned>(got),
                 static_cast<unsigned>(wanted));
    std::fflush(stderr);
    std::_Exit(1);
}

inline std::size_t entries(const char *folder)
{
    const std::filesystem::directory_iterator all(folder);
    return static_cast<std::size_t>(std::distance(begin(all), end(all)));
}

/// What a process has of its own beside memory.
struct Possessions {
    std::size_t threads = entries("/proc/self/task");
    std::size_t descriptors = entries("/proc/self/fd");

    bool operator==(const Possessions &) const = default;
};

/// To be called before what one has is counted: the sanitizers start a thread of their own beside the first other one.
inline void beginToHaveThreads()
{
    std::thread([] {}).join();
}

/// A thread that was joined is still listed for a moment.
inline void checkBackTo(const Possessions &before)
{
    for (int i = 0; i < 12000 && Possessions() != before; ++i)
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    const Possessions now;
    CHECK(now.threads == before.threads);
    CHECK(now.descriptors == before.descriptors);
}

} // namespace host
