// A program that loads the library, lets it go and loads it again: with everything closed, with sessions open, with calls in the
// middle on other threads, and that ends while all that is still there.
//   reloading-host LIBRARY RESOURCE...
#include "LoadedLibrary.h"

#include <future>
#include <thread>
#include <unistd.h>
#include <vector>

using host::checkBackTo;
using host::LoadedLibrary;
using host::Possessions;

namespace
{

std::vector<ViSession> openAll(const LoadedLibrary &library, ViSession manager, const std::vector<std::string> &names)
{
    std::vector<ViSession> sessions;
    for (const std::string &name : names)
        sessions.push_back(library.openSession(manager, name));
    return sessions;
}

void loadUseCloseUnload(const char *file, const std::vector<std::string> &names, const Possessions &before)
{
    const LoadedLibrary library(file);
    ViSession manager = VI_NULL;
    CHECK_STATUS(library.openManager(&manager), VI_SUCCESS);
    for (const ViSession session : openAll(library, manager, names))
        library.checkAnswer(session, 11);
    CHECK_STATUS(library.close(manager), VI_SUCCESS);
    library.unload();
    checkBackTo(before);
}

/// The library stays mapped, so what it has open goes on, and whoever loads it again finds it.
void unloadWithSessionsOpen(const char *file, const std::vector<std::string> &names, const Possessions &before)
{
    const LoadedLibrary library(file);
    ViSession manager = VI_NULL;
    CHECK_STATUS(library.openManager(&manager), VI_SUCCESS);
    const std::vector<ViSession> sessions = openAll(library, manager, names);
    library.unload();
    const LoadedLibrary again(file);
    CHECK(again.open == library.open);
    for (const ViSession session : sessions)
        again.checkAnswer(session, 22);
    CHECK_STATUS(again.close(manager), VI_SUCCESS);
    CHECK_STATUS(again.close(sessions.front()), VI_ERROR_INV_OBJECT);
    again.unload();
    checkBackTo(before);
}

void unloadInTheMiddleOfCalls(const char *file, const std::vector<std::string> &names, const Possessions &before)
{
    const LoadedLibrary library(file);
    ViSession manager = VI_NULL;
    CHECK_STATUS(library.openManager(&manager), VI_SUCCESS);
    std::vector<std::thread> threads;
    for (const ViSession session : openAll(library, manager, names)) {
        CHECK_STATUS(library.set(session, VI_ATTR_TMO_VALUE, VI_TMO_INFINITE), VI_SUCCESS);
        std::promise<void> begun;
        std::future<void> begins = begun.get_future();
        threads.emplace_back([&library, session, said = std::move(begun)]() mutable {
            said.set_value();
            ViByte byte;
            CHECK_STATUS(library.read(session, &byte, 1, nullptr), VI_ERROR_INV_OBJECT);
        });
        begins.wait();
    }
    library.unload();
    const LoadedLibrary again(file);
    CHECK_STATUS(again.close(manager), VI_SUCCESS);
    again.unload();
    for (std::thread &thread : threads)
        thread.join();
    checkBackTo(before);
}

/// Ends the program with sessions open, the library's threads at work and a call that never returns.
void leaveEverythingBehind(const char *file, const std::vector<std::string> &names)
{
    static const LoadedLibrary library(file);
    ViSession manager = VI_NULL;
    CHECK_STATUS(library.openManager(&manager), VI_SUCCESS);
    const std::vector<ViSession> sessions = openAll(library, manager, names);
    CHECK_STATUS(library.set(sessions.front(), VI_ATTR_TMO_VALUE, VI_TMO_INFINITE), VI_SUCCESS);
    std::thread([session = sessions.front()] {
        static ViByte byte;
        library.read(session, &byte, 1, nullptr);
    }).detach();
    library.unload();
}

} // namespace

int main(int argc, char **argv)
{
    CHECK(argc > 2);
    ::alarm(300); // whatever hangs ends by a signal
    const std::vector<std::string> names(argv + 2, argv + argc);
    host::beginToHaveThreads();
    const Possessions before;
    for (int round = 0; round < 5; ++round)
        loadUseCloseUnload(argv[1], names, before);
    for (int round = 0; round < 5; ++round)
        unloadWithSessionsOpen(argv[1], names, before);
    for (int round = 0; round < 5; ++round)
        unloadInTheMiddleOfCalls(argv[1], names, before);
    leaveEverythingBehind(argv[1], names);
    return 0;
}
