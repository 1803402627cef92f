#include "bench/BenchSimulator.h"

#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <memory>
#include <regex>
#include <stdexcept>
#include <string>

namespace bench
{

BenchSimulator::BenchSimulator()
{
    int out[2];
    if (::pipe(out) != 0)
        throw std::runtime_error("no pipe");
    m_process = ::fork();
    if (m_process == 0) {
        ::dup2(out[1], STDOUT_FILENO);
        ::close(out[0]);
        ::close(out[1]);
        ::execl(SIMULATOR_PROGRAM, SIMULATOR_PROGRAM, "--hislip", "0", "--socket", "0", "--vxi11", "0", "--portmapper",
                "0", "--max-clients", "100", nullptr);
        ::_exit(127);
    }
    ::close(out[1]);
    std::unique_ptr<FILE, int (*)(FILE *)> said(::fdopen(out[0], "r"), &::fclose);
    const std::regex hislip("hislip TCPIP::127\\.0\\.0\\.1::hislip0,([0-9]+)::INSTR\n");
    const std::regex socket("socket TCPIP::127\\.0\\.0\\.1::([0-9]+)::SOCKET\n");
    const std::regex portmapper("portmapper 127\\.0\\.0\\.1 ([0-9]+)\n");
    char line[512];
    while (std::fgets(line, sizeof line, said.get())) {
        std::cmatch match;
        if (std::regex_match(line, match, hislip))
            m_hislip = static_cast<std::uint16_t>(std::stoi(match[1]));
        else if (std::regex_match(line, match, socket))
            m_socket = static_cast<std::uint16_t>(std::stoi(match[1]));
        else if (std::regex_match(line, match, portmapper))
            m_portmapper = static_cast<std::uint16_t>(std::stoi(match[1]));
        else if (std::string(line) == "ready\n")
            break;
    }
    if (m_hislip == 0 || m_socket == 0 || m_portmapper == 0)
        throw std::runtime_error("the simulator did not start");
    // The pipe is closed from here on: the simulator says nothing more on its own.
}

BenchSimulator::~BenchSimulator()
{
    ::kill(m_process, SIGTERM);
    ::waitpid(m_process, nullptr, 0);
}

} // namespace bench
