// A program that forks again and again while its threads are in the middle of calls: each child uses sessions of its own, and the
// parent's conversations go on as if nothing had happened.
//   forking-host RESOURCE... -- RESOURCE...        the parent's and the children's
#include "HostCheck.h"

#include <visa.h>

#include <algorithm>
#include <atomic>
#include <string>
#include <string_view>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>
#include <vector>

namespace
{

constexpr int Forks = 30;

class Session
{
public:
    Session(ViSession manager, const std::string &name)
    {
        CHECK_STATUS(viOpen(manager, name.c_str(), VI_NO_LOCK, 60000, &vi), VI_SUCCESS);
        CHECK_STATUS(viSetAttribute(vi, VI_ATTR_TMO_VALUE, 60000), VI_SUCCESS);
        if (name.ends_with("::SOCKET"))
            CHECK_STATUS(viSetAttribute(vi, VI_ATTR_TERMCHAR_EN, VI_TRUE), VI_SUCCESS);
    }
    ViStatus write(std::string_view text) const
    {
        return viWrite(vi, reinterpret_cast<ViConstBuf>(text.data()), static_cast<ViUInt32>(text.size()), nullptr);
    }
    void checkAnswer() const
    {
        char answer[64] = "";
        ViUInt32 count = 0;
        CHECK_STATUS(write("*OPC?\n"), VI_SUCCESS);
        CHECK(viRead(vi, reinterpret_cast<ViPBuf>(answer), sizeof answer, &count) >= VI_SUCCESS);
        CHECK(std::string_view(answer, count) == "1\n");
    }

    ViSession vi = VI_NULL;
};

int beChild(ViSession manager, const std::vector<std::string> &names, ViSession inherited)
{
    ::alarm(120);
    CHECK_STATUS(viClear(inherited), VI_ERROR_CONN_LOST);
    for (const std::string &name : names) {
        const Session own(manager, name);
        for (int i = 0; i < 5; ++i)
            own.checkAnswer();
        CHECK_STATUS(viClose(own.vi), VI_SUCCESS);
    }
    CHECK_STATUS(viClose(manager), VI_SUCCESS); // and with it what was inherited
    return 0;
}

} // namespace

int main(int argc, char **argv)
{
    ::alarm(300);
    const std::vector<std::string> arguments(argv + 1, argv + argc);
    const auto separator = std::find(arguments.begin(), arguments.end(), "--");
    CHECK(separator != arguments.begin() && separator != arguments.end());
    const std::vector<std::string> names(arguments.begin(), separator);
    const std::vector<std::string> childrensNames(separator + 1, arguments.end());
    ViSession manager = VI_NULL;
    CHECK_STATUS(viOpenDefaultRM(&manager), VI_SUCCESS);
    const Session idle(manager, names.front());
    std::atomic<bool> stop{false};
    std::atomic<unsigned> answers{0};
    std::vector<std::thread> threads;
    for (const std::string &name : names)
        threads.emplace_back([&, name] {
            while (!stop) {
                const Session session(manager, name);
                for (int i = 0; i < 20; ++i, ++answers)
                    session.checkAnswer();
                CHECK_STATUS(viClose(session.vi), VI_SUCCESS);
            }
        });
    for (int i = 0; i < Forks; ++i) {
        const unsigned before = answers;
        const pid_t child = ::fork();
        if (child == 0)
            std::_Exit(beChild(manager, childrensNames, idle.vi));
        int status = -1;
        CHECK(child > 0 && ::waitpid(child, &status, 0) == child);
        CHECK(WIFEXITED(status) && WEXITSTATUS(status) == 0);
        while (answers < before + 10) // in the middle of use, not before or behind it
            std::this_thread::yield();
    }
    stop = true;
    for (std::thread &thread : threads)
        thread.join();
    idle.checkAnswer();
    CHECK_STATUS(viClose(manager), VI_SUCCESS);
    return 0;
}
