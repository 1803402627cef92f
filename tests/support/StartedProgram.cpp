#include "support/StartedProgram.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <poll.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstring>
#include <utility>

namespace
{
constexpr int WaitMs = 30000;

int s_writeEnd = -1; ///< where a starting process reports, or -1 while nobody listens

/// Runs in the forked process: system calls and nothing else.
int become(const char *path, char *const arguments[], char *const environment[])
{
    if (s_writeEnd < 0)
        return static_cast<int>(syscall(SYS_execve, path, arguments, environment));
    char line[1000] = "";
    std::strncat(line, path, 400);
    for (char *const *argument = arguments + 1; *argument && std::strlen(line) < 500; ++argument) {
        std::strcat(line, " ");
        std::strncat(line, *argument, 400);
    }
    _exit(write(s_writeEnd, line, std::strlen(line)) < 0 ? 1 : 0);
}
} // namespace

// These take the place of the C library's, for the libraries of the process too.
extern "C" int execve(const char *path, char *const arguments[], char *const environment[]) noexcept
{
    return become(path, arguments, environment);
}

extern "C" int execv(const char *path, char *const arguments[]) noexcept
{
    return become(path, arguments, environ);
}

StartedProgram::StartedProgram() : m_readEnd(-1)
{
    int ends[2] = {-1, -1};
    EXPECT_EQ(pipe2(ends, O_CLOEXEC), 0);
    m_readEnd = ends[0];
    s_writeEnd = ends[1];
}

StartedProgram::~StartedProgram()
{
    close(std::exchange(s_writeEnd, -1));
    close(m_readEnd);
}

std::string StartedProgram::commandLine() const
{
    pollfd waiting{m_readEnd, POLLIN, 0};
    char line[1000];
    if (poll(&waiting, 1, WaitMs) != 1)
        return {};
    const ssize_t length = read(m_readEnd, line, sizeof line);
    return length > 0 ? std::string(line, static_cast<std::size_t>(length)) : std::string();
}
