#pragma once

#include <sys/types.h>

#include <fstream>
#include <iterator>
#include <string>

/// True once a thread or another process (of one thread) sleeps, as one does that waits for a lock or a permit.
inline bool isAsleep(pid_t thread)
{
    std::ifstream file("/proc/" + std::to_string(thread) + "/stat");
    const std::string text((std::istreambuf_iterator<char>(file)), {});
    const auto name = text.rfind(')');
    return name != std::string::npos && text.compare(name, 3, ") S") == 0;
}
