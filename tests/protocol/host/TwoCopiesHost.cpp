// A program that has the library twice, under two names: two plug-ins that each brought their own. They know nothing of each
// other, and what one does leaves the other alone; locks hold between them as between two programs.
//   two-copies-host LIBRARY COPY SOCKET_RESOURCE RESOURCE...
#include "LoadedLibrary.h"

#include <array>
#include <thread>
#include <unistd.h>
#include <vector>

using host::checkBackTo;
using host::LoadedLibrary;
using host::Possessions;

namespace
{

void talk(const LoadedLibrary &library, ViSession manager, const std::string &name)
{
    const ViSession session = library.openSession(manager, name);
    std::string answer;
    for (int i = 0; i < 50; ++i) {
        CHECK(library.query(session, "*OPC?\n", answer) >= VI_SUCCESS);
        CHECK(answer == "1\n");
    }
    CHECK_STATUS(library.close(session), VI_SUCCESS);
}

void lockOneOut(const std::array<LoadedLibrary, 2> &copies, const std::array<ViSession, 2> &managers,
                const std::string &socket)
{
    const std::array sessions = {copies[0].openSession(managers[0], socket),
                                 copies[1].openSession(managers[1], socket)};
    std::string answer;
    for (const std::size_t holder : {0u, 1u}) {
        const std::size_t other = 1 - holder;
        CHECK_STATUS(copies[holder].lock(sessions[holder], VI_EXCLUSIVE_LOCK, 60000, nullptr, nullptr), VI_SUCCESS);
        CHECK_STATUS(copies[other].query(sessions[other], "*OPC?\n", answer), VI_ERROR_RSRC_LOCKED);
        copies[holder].checkAnswer(sessions[holder], 33);
        CHECK_STATUS(copies[holder].unlock(sessions[holder]), VI_SUCCESS);
        copies[other].checkAnswer(sessions[other], 44);
    }
}

} // namespace

int main(int argc, char **argv)
{
    CHECK(argc > 4);
    ::alarm(300);
    host::beginToHaveThreads();
    const Possessions before;
    const std::array copies = {LoadedLibrary(argv[1]), LoadedLibrary(argv[2])};
    CHECK(copies[0].open != copies[1].open);
    std::array<ViSession, 2> managers{};
    for (const std::size_t i : {0u, 1u})
        CHECK_STATUS(copies[i].openManager(&managers[i]), VI_SUCCESS);
    lockOneOut(copies, managers, argv[3]);
    std::vector<std::thread> threads;
    for (int name = 4; name < argc; ++name)
        for (const std::size_t i : {0u, 1u})
            threads.emplace_back(
                [&, i, resource = std::string(argv[name])] { talk(copies[i], managers[i], resource); });
    for (std::thread &thread : threads)
        thread.join();
    // The end of one is nothing to the other.
    CHECK_STATUS(copies[0].close(managers[0]), VI_SUCCESS);
    copies[0].unload();
    talk(copies[1], managers[1], argv[4]);
    CHECK_STATUS(copies[1].close(managers[1]), VI_SUCCESS);
    copies[1].unload();
    checkBackTo(before);
    return 0;
}
