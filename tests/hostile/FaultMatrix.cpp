// Every fault of the simulator on one way, met by every operation of the tester.
//   fault-matrix PAGE WAY                   all cells of the way's table; status 1 when one is not what the page says
//   fault-matrix PAGE WAY FAULT OPERATION...  these cells, one line each: the operation, its status, what else was wrong
#include "hostile/MatrixPage.h"
#include "hostile/MatrixWay.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <csignal>
#include <cstdio>
#include <fcntl.h>
#include <iostream>
#include <map>
#include <mutex>
#include <spawn.h>
#include <sstream>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>
#include <utility>

extern char **environ;

using namespace hostile;

namespace
{

constexpr int CellsWithTimeout = 6; ///< of one process: these take their time
constexpr int CellsOfAProcess = 23;
constexpr std::size_t AtOnce = 12;    ///< processes, which mostly wait
constexpr unsigned LongestCell = 120; ///< seconds, after which a cell hangs

bool expectsTimeout(const std::string &cell)
{
    return cell == "TMO";
}

int runCells(const MatrixTable &table, const std::string &wayName, const std::string &fault,
             const std::vector<std::string> &operations)
{
    std::signal(SIGPIPE, SIG_IGN);
    ::alarm(LongestCell);
    MatrixWay way(wayName);
    for (const std::string &operation : operations) {
        ::alarm(LongestCell); // ends this process: the cell it was at is told by what it has not said
        const std::string &cell = table.cells.at(fault).at(operation);
        std::string troubles;
        std::string status;
        if (cell == "refused") {
            status = way.takes(fault) ? "taken" : "refused";
        } else {
            try {
                status = shortName(way.run(fault, operation, expectsTimeout(cell), troubles));
            } catch (const VisaError &error) {
                status = std::string("preparation: ") + VisaError::StatusCode(error.getStatus());
            } catch (const std::exception &error) {
                status = std::string("exception: ") + error.what();
            }
        }
        std::cout << operation << '\t' << status << '\t' << troubles << std::endl;
    }
    return 0;
}

struct Job {
    std::string fault;
    std::vector<std::string> operations;
};

/// The cells in rows that are short enough for one process each. One cell stands for all that are refused.
std::vector<Job> jobsOf(const MatrixTable &table)
{
    std::vector<Job> jobs;
    for (const std::string &fault : table.faults) {
        Job job{fault, {}};
        int slow = 0;
        for (const std::string &operation : table.operations) {
            const std::string &cell = table.cells.at(fault).at(operation);
            if (cell == "refused" && operation != table.operations.front())
                continue;
            job.operations.push_back(operation);
            slow += expectsTimeout(cell) ? 1 : 0;
            if (slow == CellsWithTimeout || job.operations.size() == CellsOfAProcess) {
                jobs.push_back(std::exchange(job, Job{fault, {}}));
                slow = 0;
            }
        }
        if (!job.operations.empty())
            jobs.push_back(job);
    }
    return jobs;
}

/// Everything that a process of this program says, and how it ended.
std::string outputOf(std::vector<std::string> words, int &status)
{
    std::vector<char *> arguments;
    for (std::string &word : words)
        arguments.push_back(word.data());
    arguments.push_back(nullptr);
    std::array<int, 2> output{};
    status = -1;
    if (::pipe2(output.data(), O_CLOEXEC) != 0)
        return "no pipe";
    posix_spawn_file_actions_t actions;
    ::posix_spawn_file_actions_init(&actions);
    ::posix_spawn_file_actions_adddup2(&actions, output[1], STDOUT_FILENO);
    pid_t process = -1;
    const int error = ::posix_spawn(&process, "/proc/self/exe", &actions, nullptr, arguments.data(), environ);
    ::posix_spawn_file_actions_destroy(&actions);
    ::close(output[1]);
    std::string text;
    std::array<char, 4096> piece;
    for (ssize_t got = 1; error == 0 && got > 0;) {
        got = ::read(output[0], piece.data(), piece.size());
        text.append(piece.data(), static_cast<std::size_t>(std::max<ssize_t>(got, 0)));
    }
    ::close(output[0]);
    if (error == 0)
        ::waitpid(process, &status, 0);
    return text;
}

int runAll(const MatrixTable &table, const std::string &page, const std::string &way)
{
    const std::vector<Job> jobs = jobsOf(table);
    std::atomic<std::size_t> next{0};
    std::mutex mutex;
    std::size_t ran = 0;
    std::size_t wrong = 0;
    const auto work = [&] {
        for (std::size_t i = next++; i < jobs.size(); i = next++) {
            const Job &job = jobs[i];
            std::vector<std::string> words = {"fault-matrix", page, way, job.fault};
            words.insert(words.end(), job.operations.begin(), job.operations.end());
            int ended = 0;
            std::istringstream lines(outputOf(words, ended));
            std::map<std::string, std::pair<std::string, std::string>> said;
            for (std::string line; std::getline(lines, line);) {
                const std::size_t first = line.find('\t');
                const std::size_t second = line.find('\t', first + 1);
                if (second != std::string::npos)
                    said[line.substr(0, first)] = {line.substr(first + 1, second - first - 1), line.substr(second + 1)};
            }
            const std::lock_guard lock(mutex);
            for (const std::string &operation : job.operations) {
                ++ran;
                const auto [status, troubles] =
                    said.count(operation) != 0 ? said[operation] : std::pair{std::string("nothing"), std::string()};
                const std::string &expected = table.cells.at(job.fault).at(operation);
                if (status == expected && troubles.empty())
                    continue;
                ++wrong;
                std::cout << way << ", " << job.fault << ", " << operation << ": expected " << expected << ", got "
                          << status << (troubles.empty() ? "" : "; " + troubles) << std::endl;
            }
            if (ended != 0) {
                ++wrong;
                std::cout << way << ", " << job.fault << ": the process ended with " << ended << std::endl;
            }
        }
    };
    std::vector<std::thread> threads;
    for (std::size_t i = 0; i < std::min(AtOnce, jobs.size()); ++i)
        threads.emplace_back(work);
    for (std::thread &thread : threads)
        thread.join();
    std::cout << way << ": " << ran << " cells, " << wrong << " wrong" << std::endl;
    return wrong == 0 && ran > 0 ? 0 : 1;
}

} // namespace

int main(int argc, char **argv)
{
    const std::vector<std::string> words(argv + 1, argv + argc);
    if (words.size() < 2 || words.size() == 3) {
        std::fprintf(stderr, "usage: fault-matrix PAGE WAY [FAULT OPERATION...]\n");
        return 2;
    }
    try {
        const MatrixTable table = readMatrix(words[0], words[1]);
        if (words.size() == 2)
            return runAll(table, words[0], words[1]);
        return runCells(table, words[1], words[2], {words.begin() + 3, words.end()});
    } catch (const VisaError &error) {
        std::fprintf(stderr, "fault-matrix: %s\n", VisaError::StatusCode(error.getStatus()));
    } catch (const std::exception &error) {
        std::fprintf(stderr, "fault-matrix: %s\n", error.what());
    }
    return 1;
}
