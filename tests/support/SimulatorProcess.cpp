#include "support/SimulatorProcess.h"

#include <array>
#include <csignal>
#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sstream>
#include <stdexcept>
#include <sys/wait.h>
#include <unistd.h>
#include <utility>

extern char **environ;

namespace test
{
namespace
{

constexpr int Patience = 30000; // milliseconds: only a simulator that does not start takes that long

} // namespace

SimulatorProcess::SimulatorProcess(const std::vector<std::string> &options)
{
    std::vector<std::string> words = {SIMULATOR_FILE};
    words.insert(words.end(), options.begin(), options.end());
    std::vector<char *> arguments;
    for (std::string &word : words)
        arguments.push_back(word.data());
    arguments.push_back(nullptr);

    std::array<int, 2> output{};
    if (::pipe2(output.data(), O_CLOEXEC) != 0)
        throw std::runtime_error("no pipe for the simulator");
    posix_spawn_file_actions_t actions;
    ::posix_spawn_file_actions_init(&actions);
    ::posix_spawn_file_actions_adddup2(&actions, output[1], STDOUT_FILENO);
    const int error = ::posix_spawn(&m_process, arguments[0], &actions, nullptr, arguments.data(), environ);
    ::posix_spawn_file_actions_destroy(&actions);
    ::close(output[1]);
    m_output = output[0];
    if (error == 0)
        readServices();
    if (error != 0)
        throw std::runtime_error("the simulator does not start: " + words[0]);
}

SimulatorProcess::~SimulatorProcess()
{
    if (m_process > 0)
        stop(SIGTERM);
    closeOutput();
}

int SimulatorProcess::stop(int signal)
{
    int status = 0;
    ::kill(m_process, signal);
    ::waitpid(m_process, &status, 0);
    m_process = -1;
    return WIFEXITED(status) ? WEXITSTATUS(status) : 256 + WTERMSIG(status);
}

void SimulatorProcess::closeOutput()
{
    if (m_output >= 0)
        ::close(std::exchange(m_output, -1));
}

bool SimulatorProcess::readMore()
{
    pollfd watched{m_output, POLLIN, 0};
    std::array<char, 1024> piece;
    const ssize_t got = ::poll(&watched, 1, Patience) == 1 ? ::read(m_output, piece.data(), piece.size()) : -1;
    m_text.append(piece.data(), static_cast<std::size_t>(got > 0 ? got : 0));
    return got > 0;
}

std::string SimulatorProcess::nextLine()
{
    while (m_text.find('\n') == m_text.npos)
        if (!readMore())
            return {};
    const std::string line = m_text.substr(0, m_text.find('\n'));
    m_text.erase(0, line.size() + 1);
    return line;
}

void SimulatorProcess::readServices()
{
    constexpr std::string_view Ready = "ready\n";
    while (m_text.find(Ready) == m_text.npos)
        if (!readMore()) {
            ::kill(m_process, SIGKILL);
            ::waitpid(m_process, nullptr, 0);
            closeOutput();
            throw std::runtime_error("the simulator never got ready, it said: " + m_text);
        }
    const std::size_t end = m_text.find(Ready) + Ready.size();
    std::istringstream lines(m_text.substr(0, end));
    m_text.erase(0, end);
    for (std::string line; std::getline(lines, line);) {
        const std::size_t first = line.find(' ');
        const std::size_t last = line.rfind(' ');
        if (first != line.npos)
            m_resources[line.substr(0, first)] = line.substr(last + 1);
    }
}

std::string SimulatorProcess::resource(const std::string &service) const
{
    const auto found = m_resources.find(service);
    return found == m_resources.end() ? std::string() : found->second;
}

std::uint16_t SimulatorProcess::port(const std::string &service) const
{
    const std::string name = resource(service);
    if (name.starts_with("http://"))
        return static_cast<std::uint16_t>(std::stoi(name.substr(name.rfind(':') + 1)));
    const std::size_t end = name.rfind("::");
    const std::size_t begin = end == name.npos ? name.npos : name.find_last_of(":,", end - 1);
    return begin == name.npos ? 0 : static_cast<std::uint16_t>(std::stoi(name.substr(begin + 1, end - begin - 1)));
}

} // namespace test
