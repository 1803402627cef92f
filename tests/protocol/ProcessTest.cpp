// The library as a guest in a process: fork, dlopen under two names, no threads and no output of its own.
#include "support/ClosedPort.h"
#include "support/HislipPeer.h"
#include "support/QuietFork.h"
#include "support/VisaSession.h"

#include <atomic>
#include <csignal>
#include <dlfcn.h>
#include <filesystem>
#include <fstream>
#include <gtest/gtest.h>
#include <map>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

using test::acceptHislip;
using test::ClosedPort;
using test::hex;
using test::HislipConnections;
using test::ScriptedPeer;
using test::VisaSession;

namespace
{

std::string resource(const ScriptedPeer &peer)
{
    return "TCPIP::127.0.0.1::hislip0," + std::to_string(peer.port()) + "::INSTR";
}

std::size_t entries(const char *folder)
{
    const std::filesystem::directory_iterator all(folder);
    return static_cast<std::size_t>(std::distance(begin(all), end(all)));
}

/// Exit status of @p child, which must end by itself.
template <typename Child>
int inFork(Child child)
{
    const pid_t pid = test::forkWhileOthersWait();
    if (pid == 0) {
        ::alarm(30); // a child that hangs ends by a signal and fails the test
        ::_exit(child());
    }
    int status = -1;
    ::waitpid(pid, &status, 0);
    return WIFEXITED(status) ? WEXITSTATUS(status) : 1000 + WTERMSIG(status);
}

TEST(Process, ForkedChildMayCloseAndOpenAnewAndTheParentNoticesNothing)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        HislipConnections first = acceptHislip(self);
        first.async.expect(hex("48530401 00000000 0000000000000000")); // the parent's lock
        first.async.send(hex("48530501 00000000 0000000000000000"));
        {
            HislipConnections second = acceptHislip(self); // the child's own
            second.sync.expect(hex("48530700 FFFFFF00 0000000000000005") + "child");
            second.sync.expectClosed();
        }
        first.sync.expect(hex("48530700 FFFFFF00 0000000000000006") + "parent");
        first.async.send(hex("48531442 00000000 0000000000000000"));
        first.sync.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, 0),
              VI_SUCCESS); // a thread that fork() does not copy
    ASSERT_EQ(viLock(session.vi, VI_EXCLUSIVE_LOCK, 0, nullptr, nullptr), VI_SUCCESS);
    const int status = inFork([&] {
        ViUInt16 byte = 0;
        if (viReadSTB(session.vi, &byte) != VI_ERROR_CONN_LOST)
            return 1;
        if (session.write("x") != VI_ERROR_CONN_LOST)
            return 2;
        // The events are the parent's: nothing would ever end this wait.
        if (viWaitOnEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_TMO_INFINITE, nullptr, nullptr) != VI_ERROR_CONN_LOST)
            return 7;
        if (viDisableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_ALL_MECH) != VI_ERROR_CONN_LOST)
            return 8;
        if (viTerminate(session.vi, VI_NULL, VI_NULL) != VI_ERROR_CONN_LOST)
            return 9;
        ViSession fresh = VI_NULL;
        if (viOpen(session.rm, resource(peer).c_str(), 0, 10000, &fresh) != VI_SUCCESS)
            return 3;
        if (viWrite(fresh, reinterpret_cast<ViConstBuf>("child"), 5, nullptr) != VI_SUCCESS)
            return 4;
        if (viClose(session.vi) != VI_SUCCESS || viClose(session.vi) != VI_ERROR_INV_OBJECT)
            return 5;
        return viClose(session.rm) == VI_SUCCESS ? 0 : 6;
    });
    EXPECT_EQ(status, 0);
    EXPECT_EQ(session.write("parent"), VI_SUCCESS);
    EXPECT_EQ(viWaitOnEvent(session.vi, VI_EVENT_SERVICE_REQ, 20000, nullptr, nullptr), VI_SUCCESS);
    viClose(session.vi);
}

TEST(Process, ForkedChildThatOnlyClosesEnds)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        client.sync.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, 0), VI_SUCCESS);
    EXPECT_EQ(inFork([&] { return viClose(session.rm) == VI_SUCCESS ? 0 : 1; }), 0);
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
}

std::size_t eventDescriptors()
{
    std::size_t count = 0;
    for (const auto &entry : std::filesystem::directory_iterator("/proc/self/fd")) {
        std::error_code gone;
        count += std::filesystem::read_symlink(entry.path(), gone) == "anon_inode:[eventfd]" ? 1 : 0;
    }
    return count;
}

TEST(Process, ForkedChildThatClosesKeepsNoDescriptor)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        client.sync.expectClosed();
    });
    const std::size_t before = eventDescriptors();
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, 0), VI_SUCCESS);
    EXPECT_GT(eventDescriptors(), before);
    EXPECT_EQ(inFork([&] { return viClose(session.vi) == VI_SUCCESS ? static_cast<int>(eventDescriptors()) : 100; }),
              static_cast<int>(before));
    EXPECT_EQ(viClose(session.vi), VI_SUCCESS);
}

TEST(Process, StartsNoThreadAndKeepsNoDescriptorForAResourceManager)
{
    const std::size_t threads = entries("/proc/self/task");
    const std::size_t descriptors = entries("/proc/self/fd");
    VisaSession session;
    EXPECT_EQ(entries("/proc/self/task"), threads);
    EXPECT_EQ(entries("/proc/self/fd"), descriptors);
}

TEST(Process, OpensThatFailKeepNothing)
{
    const ClosedPort closed;
    ScriptedPeer peer([](ScriptedPeer &self) {
        for (int i = 0; i < 150; ++i)
            self.accept().close();
    });
    VisaSession session;
    const std::size_t descriptors = entries("/proc/self/fd");
    for (int i = 0; i < 150; ++i) {
        EXPECT_EQ(session.open("TCPIP::127.0.0.1::" + std::to_string(closed.number()) + "::SOCKET"),
                  VI_ERROR_RSRC_NFOUND);
        EXPECT_EQ(session.open(resource(peer)), VI_ERROR_RSRC_NFOUND);
    }
    peer.finish();
    EXPECT_EQ(entries("/proc/self/fd"), descriptors);
}

TEST(Process, AQueryNeedsNoThread)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        client.sync.expect(hex("48530700 FFFFFF00 0000000000000002") + "?\n");
        client.sync.send(hex("48530700 FFFFFF00 0000000000000002") + "ok");
        client.sync.expectClosed();
    });
    VisaSession session;
    const std::size_t threads = entries("/proc/self/task");
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    EXPECT_EQ(session.write("?\n"), VI_SUCCESS);
    EXPECT_EQ(session.read(), VI_SUCCESS);
    EXPECT_EQ(entries("/proc/self/task"), threads);
    viClose(session.vi);
}

/// The signals that each thread of this process blocks, by thread.
std::map<std::string, unsigned long long> blockedSignals()
{
    std::map<std::string, unsigned long long> blocked;
    for (const auto &task : std::filesystem::directory_iterator("/proc/self/task")) {
        std::ifstream status(task.path() / "status");
        for (std::string line; std::getline(status, line);)
            if (line.starts_with("SigBlk:"))
                blocked[task.path().filename().string()] = std::stoull(line.substr(7), nullptr, 16);
    }
    return blocked;
}

ViStatus noteEvent(ViSession, ViEventType, ViEvent, ViAddr called)
{
    *static_cast<std::atomic<bool> *>(called) = true;
    return VI_SUCCESS;
}

TEST(Process, ThreadsOfTheLibraryTakeNoSignals)
{
    ScriptedPeer peer([](ScriptedPeer &self) {
        HislipConnections client = acceptHislip(self);
        client.async.send(hex("48531442 00000000 0000000000000000"));
        client.sync.expectClosed();
    });
    VisaSession session;
    ASSERT_EQ(session.open(resource(peer)), VI_SUCCESS);
    sigset_t none; // whatever this program was started with
    sigset_t inherited;
    ::sigemptyset(&none);
    ASSERT_EQ(::pthread_sigmask(SIG_SETMASK, &none, &inherited), 0);
    const auto before = blockedSignals();
    std::atomic<bool> called{false};
    ASSERT_EQ(viInstallHandler(session.vi, VI_EVENT_SERVICE_REQ, noteEvent, &called), VI_SUCCESS);
    ASSERT_EQ(viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_HNDLR, 0), VI_SUCCESS);
    while (!called) // both threads run by then: one that is just starting blocks signals in any case
        std::this_thread::yield();
    int ofTheLibrary = 0;
    for (const auto &[thread, blocked] : blockedSignals()) {
        if (before.contains(thread))
            continue;
        ++ofTheLibrary;
        for (const int signal : {SIGHUP, SIGINT, SIGTERM, SIGUSR1, SIGALRM, SIGCHLD, SIGIO, SIGRTMIN + 5})
            EXPECT_NE(blocked & 1ull << (signal - 1), 0u) << "signal " << signal;
    }
    EXPECT_EQ(ofTheLibrary, 2); // one reads, one calls handlers
    EXPECT_EQ(::pthread_sigmask(SIG_SETMASK, &inherited, nullptr), 0);
    viClose(session.vi);
}

TEST(Process, TwoCopiesUnderTwoNamesAreStrangers)
{
    const std::filesystem::path original = LIBRARY_FILE;
    const std::filesystem::path copy =
        std::filesystem::temp_directory_path() / ("libkyvisa-copy-" + std::to_string(::getpid()) + ".so");
    std::filesystem::copy_file(original, copy, std::filesystem::copy_options::overwrite_existing);
    void *library = ::dlopen(copy.c_str(), RTLD_NOW | RTLD_LOCAL);
    std::filesystem::remove(copy);
    ASSERT_NE(library, nullptr) << ::dlerror();
    const auto open = reinterpret_cast<decltype(&viOpenDefaultRM)>(::dlsym(library, "viOpenDefaultRM"));
    const auto close = reinterpret_cast<decltype(&viClose)>(::dlsym(library, "viClose"));
    ASSERT_NE(open, nullptr);
    ASSERT_NE(close, nullptr);

    VisaSession session;
    ViSession theirs = VI_NULL;
    EXPECT_EQ(open(&theirs), VI_SUCCESS);
    EXPECT_EQ(close(theirs), VI_SUCCESS);
    EXPECT_EQ(close(theirs), VI_ERROR_INV_OBJECT);
    ViUInt16 id = 0;
    EXPECT_EQ(viGetAttribute(session.rm, VI_ATTR_RSRC_MANF_ID, &id), VI_SUCCESS);
    EXPECT_EQ(id, 4015);
    EXPECT_EQ(::dlclose(library), 0);
}

} // namespace
