// The bottom layer when the system says no: each call fails once, nothing leaks, nothing hangs.
#include "kyvisa/os/SystemCalls.h"
#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/core/ResourceName.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/Connector.h"
#include "kyvisa/os/ListeningSocket.h"
#include "kyvisa/os/Resolver.h"
#include "kyvisa/transport/HislipConnector.h"
#include "kyvisa/transport/Transport.h"
#include "support/HislipPeer.h"
#include "support/ScriptedPeer.h"
#include "support/Stopwatch.h"

#include <array>
#include <atomic>
#include <cerrno>
#include <filesystem>
#include <gtest/gtest.h>
#include <memory>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <thread>
#include <vector>

using namespace kyvisa::os;
using test::ScriptedPeer;
using test::Stopwatch;

namespace
{

WaitLimit within(int milliseconds, const Wakeup &wakeup)
{
    return {Deadline::after(std::chrono::milliseconds(milliseconds)), wakeup};
}

std::size_t openDescriptors()
{
    const std::filesystem::directory_iterator entries("/proc/self/fd");
    return static_cast<std::size_t>(std::distance(begin(entries), end(entries)));
}

void failWith(int error)
{
    errno = error;
}

TEST(Deadline, ComesFromTheTimeOutsOfTheInterface)
{
    EXPECT_TRUE(Deadline::afterVisaTimeout(0).expired());
    EXPECT_TRUE(Deadline::afterVisaTimeout(0xFFFFFFFF).isNever());
    EXPECT_FALSE(Deadline::afterVisaTimeout(0xFFFFFFFF).expired());
    const Deadline longest = Deadline::afterVisaTimeout(0xFFFFFFFE);
    EXPECT_FALSE(longest.expired());
    EXPECT_FALSE(longest.isNever());
    EXPECT_EQ(Deadline::now().remaining().count(), 0);
    EXPECT_EQ(longest.orEarlier(Deadline::never()).end(), longest.end());
}

TEST(Connector, RefusedAddressGoesOnWithTheNext)
{
    ScriptedPeer peer([](ScriptedPeer &self) { self.accept().expectClosed(); }); // IPv4 alone; ::1 is tried first
    const Wakeup nobody;
    StreamSocket socket;
    EXPECT_EQ(connectStream("localhost", peer.port(), within(20000, nobody), socket), IoResult::Done);
    EXPECT_EQ(socket.peerAddress(), "127.0.0.1");
}

TEST(Connector, SilentAddressDoesNotEatTheTimeOfTheNext)
{
    static std::atomic<int> attempts;
    attempts = 0;
    SystemCalls calls = realSystemCalls();
    // The first address never answers: its connection stays in progress for ever.
    calls.connect = [](int descriptor, const sockaddr *address, socklen_t length) {
        if (attempts++ > 0)
            return ::connect(descriptor, address, length);
        failWith(EINPROGRESS);
        return -1;
    };
    calls.getsockopt = [](int descriptor, int level, int option, void *value, socklen_t *length) {
        return ::getsockopt(descriptor, level, option, value, length);
    };
    calls.poll = [](pollfd *watched, nfds_t count, const timespec *timeout) {
        // A socket that never began to connect reports a hang-up at once; the network would stay silent.
        std::array<pollfd, 8> copy{};
        std::copy(watched, watched + count, copy.begin());
        if (count >= 2)
            copy[0].fd = -1;
        const int ready = ::ppoll(copy.data(), count, timeout, nullptr);
        for (nfds_t i = 0; i < count; ++i)
            watched[i].revents = copy[i].revents;
        return ready;
    };
    ScriptedPeer peer([](ScriptedPeer &self) { self.accept().expectClosed(); });
    const Wakeup nobody;
    StreamSocket socket;
    const Stopwatch watch;
    {
        const ReplacedSystemCalls replaced(calls);
        EXPECT_EQ(connectStream("localhost", peer.port(), within(20000, nobody), socket), IoResult::Done);
    }
    EXPECT_LT(watch.milliseconds(), 10000);
}

TEST(Connector, WakeUpEndsAConnectionAttempt)
{
    SystemCalls calls = realSystemCalls();
    calls.connect = [](int, const sockaddr *, socklen_t) {
        failWith(EINPROGRESS);
        return -1;
    };
    calls.poll = [](pollfd *watched, nfds_t count, const timespec *timeout) {
        const int ready = ::ppoll(watched + count - 1, 1, timeout, nullptr); // the wake-up alone
        for (nfds_t i = 0; i + 1 < count; ++i)
            watched[i].revents = 0;
        return ready;
    };
    const ReplacedSystemCalls replaced(calls);
    Wakeup wakeup;
    std::thread other([&] { wakeup.close(); });
    StreamSocket socket;
    EXPECT_EQ(connectStream("127.0.0.1", 9, {Deadline::never(), wakeup}, socket), IoResult::Woken);
    other.join();
}

TEST(Connector, FailingCallsLeakNothing)
{
    const Wakeup nobody;
    StreamSocket socket;
    const std::size_t before = openDescriptors();
    {
        SystemCalls calls = realSystemCalls();
        calls.socket = [](int, int, int) {
            failWith(EMFILE);
            return -1;
        };
        const ReplacedSystemCalls replaced(calls);
        EXPECT_EQ(connectStream("127.0.0.1", 9, within(20000, nobody), socket), IoResult::NoMemory);
    }
    {
        SystemCalls calls = realSystemCalls();
        calls.connect = [](int, const sockaddr *, socklen_t) {
            failWith(ENETUNREACH);
            return -1;
        };
        const ReplacedSystemCalls replaced(calls);
        EXPECT_EQ(connectStream("localhost", 9, within(20000, nobody), socket), IoResult::NoAddress);
    }
    {
        SystemCalls calls = realSystemCalls();
        calls.connect = [](int, const sockaddr *, socklen_t) {
            failWith(EINPROGRESS);
            return -1;
        };
        calls.poll = [](pollfd *, nfds_t, const timespec *) {
            failWith(ENOMEM);
            return -1;
        };
        const ReplacedSystemCalls replaced(calls);
        EXPECT_EQ(connectStream("127.0.0.1", 9, within(20000, nobody), socket), IoResult::NoMemory);
    }
    EXPECT_EQ(openDescriptors(), before);
}

/// Datagram sockets find the way that stream sockets have no port left for.
int connectWithoutPorts(int descriptor, const sockaddr *, socklen_t)
{
    int type = 0;
    socklen_t length = sizeof type;
    ::getsockopt(descriptor, SOL_SOCKET, SO_TYPE, &type, &length);
    if (type == SOCK_DGRAM)
        return 0;
    failWith(EADDRNOTAVAIL);
    return -1;
}

TEST(Connector, TellsThatLocalPortsAreUsedUpFromAnAddressThatIsNotThere)
{
    const Wakeup nobody;
    StreamSocket socket;
    const std::size_t before = openDescriptors();
    SystemCalls calls = realSystemCalls();
    calls.connect = connectWithoutPorts;
    {
        const ReplacedSystemCalls replaced(calls);
        EXPECT_EQ(connectStream("127.0.0.1", 9, within(20000, nobody), socket), IoResult::NoMemory);
        EXPECT_EQ(connectStream("localhost", 9, within(20000, nobody), socket), IoResult::NoMemory);
    }
    calls.connect = [](int, const sockaddr *, socklen_t) { // IPv6 without an address of its own, for one
        failWith(EADDRNOTAVAIL);
        return -1;
    };
    {
        const ReplacedSystemCalls replaced(calls);
        EXPECT_EQ(connectStream("::1", 9, within(20000, nobody), socket), IoResult::NoAddress);
    }
    EXPECT_EQ(openDescriptors(), before);
}

TEST(ListeningSocket, TakesASparePortWhenTheSystemHasNoneToChoose)
{
    SystemCalls calls = realSystemCalls();
    calls.bind = [](int descriptor, const sockaddr *address, socklen_t length) {
        if (reinterpret_cast<const sockaddr_in *>(address)->sin_port != 0)
            return ::bind(descriptor, address, length);
        failWith(EADDRINUSE);
        return -1;
    };
    const ReplacedSystemCalls replaced(calls);
    ListeningSocket first;
    ListeningSocket second;
    ASSERT_TRUE(first.open(INADDR_LOOPBACK));
    ASSERT_TRUE(second.open(INADDR_LOOPBACK));
    EXPECT_GE(first.port(), 61000);
    EXPECT_NE(first.port(), second.port());
    const Wakeup nobody;
    StreamSocket client;
    EXPECT_EQ(connectStream("127.0.0.1", second.port(), within(20000, nobody), client), IoResult::Done);
    EXPECT_TRUE(second.accept().isOpen());
}

TEST(ListeningSocket, SaysSoWhenNoPortIsLeftAtAll)
{
    const std::size_t before = openDescriptors();
    SystemCalls calls = realSystemCalls();
    calls.bind = [](int, const sockaddr *, socklen_t) {
        failWith(EADDRINUSE);
        return -1;
    };
    const ReplacedSystemCalls replaced(calls);
    ListeningSocket listener;
    EXPECT_FALSE(listener.open(INADDR_LOOPBACK));
    EXPECT_EQ(openDescriptors(), before);
}

TEST(Wakeup, WithoutADescriptorSaysSo)
{
    SystemCalls calls = realSystemCalls();
    calls.eventfd = [](unsigned, int) {
        failWith(EMFILE);
        return -1;
    };
    const ReplacedSystemCalls replaced(calls);
    const Wakeup wakeup;
    EXPECT_FALSE(wakeup.valid());
}

TEST(Wakeup, TerminationIsForgottenAndClosingIsNot)
{
    Wakeup wakeup;
    wakeup.terminate();
    EXPECT_TRUE(wakeup.raised());
    wakeup.rearm();
    EXPECT_FALSE(wakeup.raised());
    wakeup.close();
    wakeup.rearm();
    EXPECT_TRUE(wakeup.raised());
}

TEST(Resolver, AnswersNumbersAndLocalhostWithoutAsking)
{
    SystemCalls calls = realSystemCalls();
    calls.getaddrinfo = [](const char *node, const char *service, const addrinfo *hints, addrinfo **result) {
        EXPECT_NE(hints->ai_flags & AI_NUMERICHOST, 0);
        return ::getaddrinfo(node, service, hints, result);
    };
    const ReplacedSystemCalls replaced(calls);
    const Wakeup nobody;
    std::vector<Address> addresses;
    EXPECT_EQ(resolve("127.0.0.1", 1, within(20000, nobody), addresses), IoResult::Done);
    EXPECT_EQ(addresses.size(), 1u);
    EXPECT_EQ(resolve("::1", 1, within(20000, nobody), addresses), IoResult::Done);
    EXPECT_EQ(addresses.size(), 1u);
    EXPECT_EQ(resolve("LOCALHOST", 1, within(20000, nobody), addresses), IoResult::Done);
    EXPECT_EQ(addresses.size(), 2u);
}

std::atomic<bool> g_nameServerAnswers;
std::atomic<int> g_questionsOpen;

TEST(Resolver, NameServerThatDoesNotAnswerEndsWithTheDeadlineOrTheWakeUp)
{
    g_nameServerAnswers = false;
    g_questionsOpen = 0;
    static SystemCalls calls = realSystemCalls();
    calls.getaddrinfo = [](const char *node, const char *service, const addrinfo *hints, addrinfo **result) {
        if ((hints->ai_flags & AI_NUMERICHOST) != 0)
            return ::getaddrinfo(node, service, hints, result);
        ++g_questionsOpen;
        while (!g_nameServerAnswers)
            std::this_thread::yield();
        addrinfo numeric = *hints;
        numeric.ai_flags |= AI_NUMERICHOST;
        const int status = ::getaddrinfo("127.0.0.9", service, &numeric, result);
        --g_questionsOpen;
        return status;
    };
    const ReplacedSystemCalls replaced(calls);
    std::vector<Address> addresses;
    const Wakeup nobody;
    EXPECT_EQ(resolve("box.example", 1, within(50, nobody), addresses), IoResult::TimedOut);
    Wakeup wakeup;
    std::thread other([&] { wakeup.terminate(); });
    EXPECT_EQ(resolve("box.example", 1, {Deadline::never(), wakeup}, addresses), IoResult::Woken);
    other.join();
    g_nameServerAnswers = true;
    EXPECT_EQ(resolve("box.example", 1, within(20000, nobody), addresses), IoResult::Done);
    ASSERT_EQ(addresses.size(), 1u);
    EXPECT_EQ(addresses[0].storage.ss_family, AF_INET);
    while (g_questionsOpen > 0)
        std::this_thread::yield();
}

TEST(Resolver, UnknownNameIsNoAddress)
{
    static SystemCalls calls = realSystemCalls();
    calls.getaddrinfo = [](const char *, const char *, const addrinfo *, addrinfo **) { return EAI_NONAME; };
    const ReplacedSystemCalls replaced(calls);
    std::vector<Address> addresses;
    const Wakeup nobody;
    EXPECT_EQ(resolve("nowhere.example", 1, within(20000, nobody), addresses), IoResult::NoAddress);
}

TEST(HislipTransport, ConnectsTwiceToOneAddressOfAHostThatHasSeveral)
{
    static std::atomic<int> questions;
    questions = 0;
    SystemCalls seam = realSystemCalls();
    seam.getaddrinfo = [](const char *node, const char *service, const addrinfo *hints, addrinfo **result) {
        if (std::string_view(node) != "several.test")
            return ::getaddrinfo(node, service, hints, result);
        if ((hints->ai_flags & AI_NUMERICHOST) != 0 || questions++ > 0)
            return EAI_NONAME; // asked again it would name another instrument
        return ::getaddrinfo("127.0.0.1", service, hints, result);
    };
    ScriptedPeer peer([](ScriptedPeer &self) { test::acceptHislip(self).sync.expectClosed(); });
    kyvisa::ResourceName name;
    ASSERT_EQ(kyvisa::parseResourceName("TCPIP::several.test::hislip0," + std::to_string(peer.port()), name),
              VI_SUCCESS);
    const Wakeup nobody;
    const ReplacedSystemCalls replaced(seam);
    kyvisa::AttributeStore attributes(kyvisa::kind::Hislip);
    std::unique_ptr<kyvisa::Transport> transport;
    EXPECT_EQ(kyvisa::connectHislip(name, within(20000, nobody), attributes, transport), VI_SUCCESS);
    EXPECT_EQ(questions, 1);
}

TEST(StreamSocket, WakeUpEndsAReceptionThatNeverHasToWait)
{
    ScriptedPeer peer([](ScriptedPeer &self) { self.accept().expectClosed(); });
    Wakeup wakeup;
    StreamSocket socket;
    ASSERT_EQ(connectStream("127.0.0.1", peer.port(), within(20000, wakeup), socket), IoResult::Done);
    SystemCalls seam = realSystemCalls();
    seam.recv = [](int, void *, size_t size, int) { return static_cast<ssize_t>(size); }; // there is always more
    seam.sendmsg = [](int, const msghdr *, int) -> ssize_t { return 1; };
    const ReplacedSystemCalls replaced(seam);
    std::array<std::byte, 16> buffer{};
    const WaitLimit endless{Deadline::never(), wakeup};
    EXPECT_EQ(socket.receive(buffer, endless).result, IoResult::Done);
    wakeup.close();
    EXPECT_EQ(socket.receive(buffer, endless).result, IoResult::Woken);
    std::array pieces = {iovec{buffer.data(), buffer.size()}};
    const Transfer sent = socket.send(pieces, endless);
    EXPECT_EQ(sent.result, IoResult::Woken);
    EXPECT_EQ(sent.count, 0u);
}

TEST(StreamSocket, KeepAliveSpeaksUpBeforeAFirewallForgetsTheConnection)
{
    static int idle;
    static int on;
    idle = on = 0;
    ScriptedPeer peer([](ScriptedPeer &self) { self.accept().expectClosed(); });
    const Wakeup nobody;
    StreamSocket socket;
    ASSERT_EQ(connectStream("127.0.0.1", peer.port(), within(20000, nobody), socket), IoResult::Done);
    SystemCalls seam = realSystemCalls();
    seam.setsockopt = [](int, int level, int option, const void *value, socklen_t) {
        if (level == SOL_SOCKET && option == SO_KEEPALIVE)
            on = *static_cast<const int *>(value);
        if (level == IPPROTO_TCP && option == TCP_KEEPIDLE)
            idle = *static_cast<const int *>(value);
        return 0;
    };
    const ReplacedSystemCalls replaced(seam);
    EXPECT_TRUE(socket.setKeepAlive(true));
    EXPECT_EQ(on, 1);
    EXPECT_EQ(idle, 60); // seconds; the usual limit is five minutes
    EXPECT_TRUE(socket.setKeepAlive(false));
    EXPECT_EQ(on, 0);
}

TEST(StreamSocket, SurvivesInterruptedAndShortCalls)
{
    static std::atomic<int> calls;
    calls = 0;
    SystemCalls seam = realSystemCalls();
    seam.sendmsg = [](int descriptor, const msghdr *message, int flags) -> ssize_t {
        EXPECT_NE(flags & MSG_NOSIGNAL, 0);
        if (calls++ % 3 == 0) {
            failWith(EINTR);
            return -1;
        }
        return ::send(descriptor, message->msg_iov[0].iov_base, 1, flags); // one byte at a time
    };
    seam.recv = [](int descriptor, void *buffer, size_t, int flags) -> ssize_t {
        if (calls++ % 2 == 0) {
            failWith(EINTR);
            return -1;
        }
        return ::recv(descriptor, buffer, 1, flags);
    };
    seam.poll = [](pollfd *watched, nfds_t count, const timespec *timeout) {
        if (calls++ % 2 == 0) {
            failWith(EINTR);
            return -1;
        }
        return ::ppoll(watched, count, timeout, nullptr);
    };
    ScriptedPeer peer([](ScriptedPeer &self) {
        test::PeerConnection client = self.accept();
        client.expect("header and payload");
        client.send("ok");
        client.expectClosed();
    });
    const Wakeup nobody;
    const ReplacedSystemCalls replaced(seam);
    StreamSocket socket;
    ASSERT_EQ(connectStream("127.0.0.1", peer.port(), within(20000, nobody), socket), IoResult::Done);
    std::string header = "header ";
    std::string payload = "and payload";
    std::array pieces = {iovec{header.data(), header.size()}, iovec{payload.data(), payload.size()}};
    const Transfer sent = socket.send(pieces, within(20000, nobody));
    EXPECT_EQ(sent.result, IoResult::Done);
    EXPECT_EQ(sent.count, 18u);
    std::array<std::byte, 10> buffer;
    const Transfer got = socket.receive(buffer, within(20000, nobody));
    EXPECT_EQ(got.result, IoResult::Done);
    EXPECT_EQ(got.count, 1u);
}

/// The flags of every recv, oldest first.
std::vector<int> g_receptions;

/// Receives from a silent peer until the time is up.
std::vector<int> receptionsOfASilentPeer(SystemCalls &seam, int milliseconds)
{
    ScriptedPeer peer([](ScriptedPeer &self) { self.accept().expectClosed(); });
    const Wakeup nobody;
    const ReplacedSystemCalls replaced(seam);
    StreamSocket socket;
    EXPECT_EQ(connectStream("127.0.0.1", peer.port(), within(20000, nobody), socket), IoResult::Done);
    g_receptions.clear();
    std::array<std::byte, 10> buffer;
    const Stopwatch watch;
    EXPECT_EQ(socket.receive(buffer, within(milliseconds, nobody)).result, IoResult::TimedOut);
    EXPECT_GE(watch.milliseconds(), milliseconds);
    return g_receptions;
}

SystemCalls withReceptionsNoted()
{
    SystemCalls seam = realSystemCalls();
    seam.recv = [](int descriptor, void *buffer, size_t size, int flags) -> ssize_t {
        g_receptions.push_back(flags);
        return ::recv(descriptor, buffer, size, flags);
    };
    return seam;
}

TEST(StreamSocket, WaitsInTheSystemForAMomentAndThenWhereItCanBeWoken)
{
    SystemCalls seam = withReceptionsNoted();
    EXPECT_EQ(receptionsOfASilentPeer(seam, 200), std::vector<int>{0});
}

TEST(StreamSocket, PollsAtOnceWhenLittleTimeIsLeft)
{
    SystemCalls seam = withReceptionsNoted();
    EXPECT_EQ(receptionsOfASilentPeer(seam, 20), std::vector<int>{MSG_DONTWAIT});
}

TEST(StreamSocket, PollsWhereTheSystemWillNotEndAWait)
{
    SystemCalls seam = withReceptionsNoted();
    seam.setsockopt = [](int descriptor, int level, int option, const void *value, socklen_t length) {
        if (level == SOL_SOCKET && option == SO_RCVTIMEO) {
            failWith(ENOPROTOOPT);
            return -1;
        }
        return ::setsockopt(descriptor, level, option, value, length);
    };
    EXPECT_EQ(receptionsOfASilentPeer(seam, 200), std::vector<int>{MSG_DONTWAIT});
}

TEST(StreamSocket, SignalsDoNotMakeAMomentLonger)
{
    SystemCalls seam = withReceptionsNoted();
    seam.recv = [](int descriptor, void *buffer, size_t size, int flags) -> ssize_t {
        g_receptions.push_back(flags);
        if (flags == MSG_DONTWAIT || g_receptions.size() > 10)
            return ::recv(descriptor, buffer, size, flags);
        failWith(EINTR);
        return -1;
    };
    EXPECT_EQ(receptionsOfASilentPeer(seam, 200), std::vector<int>{0});
}

TEST(StreamSocket, AWriteNeverWaitsInTheSystem)
{
    SystemCalls seam = realSystemCalls();
    static std::atomic<int> flagsOfTheWrite;
    seam.sendmsg = [](int descriptor, const msghdr *message, int flags) -> ssize_t {
        flagsOfTheWrite = flags;
        return ::sendmsg(descriptor, message, flags);
    };
    ScriptedPeer peer([](ScriptedPeer &self) {
        test::PeerConnection client = self.accept();
        client.expect("x");
        client.expectClosed();
    });
    const Wakeup nobody;
    const ReplacedSystemCalls replaced(seam);
    StreamSocket socket;
    ASSERT_EQ(connectStream("127.0.0.1", peer.port(), within(20000, nobody), socket), IoResult::Done);
    std::byte letter{'x'};
    std::array pieces = {iovec{&letter, 1}};
    EXPECT_EQ(socket.send(pieces, within(20000, nobody)).result, IoResult::Done);
    EXPECT_NE(flagsOfTheWrite & MSG_DONTWAIT, 0);
}

TEST(StreamSocket, ReadinessThatComesToNothingDoesNotOutlastTheDeadline)
{
    SystemCalls seam = realSystemCalls();
    seam.sendmsg = [](int, const msghdr *, int) -> ssize_t {
        failWith(EAGAIN);
        return -1;
    };
    seam.recv = [](int, void *, size_t, int) -> ssize_t {
        failWith(EAGAIN);
        return -1;
    };
    seam.poll = [](pollfd *watched, nfds_t, const timespec *) {
        watched[0].revents = watched[0].events;
        return 1;
    };
    ScriptedPeer peer([](ScriptedPeer &self) { self.accept().expectClosed(); });
    const Wakeup nobody;
    const ReplacedSystemCalls replaced(seam);
    StreamSocket socket;
    ASSERT_EQ(connectStream("127.0.0.1", peer.port(), within(20000, nobody), socket), IoResult::Done);
    std::array letters = {std::byte{'x'}};
    std::array pieces = {iovec{letters.data(), letters.size()}};
    EXPECT_EQ(socket.send(pieces, within(20, nobody)).result, IoResult::TimedOut);
    EXPECT_EQ(socket.receive(letters, within(20, nobody)).result, IoResult::TimedOut);
}

TEST(StreamSocket, ResetIsAClosedConnection)
{
    std::atomic<bool> connected{false};
    ScriptedPeer peer([&](ScriptedPeer &self) {
        test::PeerConnection client = self.accept();
        while (!connected)
            std::this_thread::yield();
        client.reset();
    });
    const Wakeup nobody;
    StreamSocket socket;
    ASSERT_EQ(connectStream("127.0.0.1", peer.port(), within(20000, nobody), socket), IoResult::Done);
    connected = true;
    std::array<std::byte, 10> buffer;
    EXPECT_EQ(socket.receive(buffer, within(20000, nobody)).result, IoResult::Closed);
}

} // namespace
