#pragma once

#include <string>

/**
 * Catches the programs that the code under test starts: while one exists, a process that is about to become another program
 * says which and ends instead.
 *
 *     StartedProgram started;
 *     ... what starts a program ...
 *     EXPECT_EQ(started.commandLine(), "/usr/bin/true -x");
 */
class StartedProgram
{
public:
    StartedProgram();
    ~StartedProgram();
    StartedProgram(const StartedProgram &) = delete;
    StartedProgram &operator=(const StartedProgram &) = delete;

    /// Path and arguments of the next program started, with blanks between. Empty when none is started in time.
    std::string commandLine() const;

private:
    int m_readEnd;
};
