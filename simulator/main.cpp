#include "simulator/Options.h"
#include "simulator/Services.h"
#include "simulator/server/EventLoop.h"
#include "simulator/traffic/LogPrinter.h"

#include <sys/epoll.h>
#include <sys/signalfd.h>
#include <unistd.h>

#include <csignal>
#include <exception>
#include <iostream>
#include <optional>

namespace
{

/// SIGTERM and SIGINT as a descriptor of the event loop.
simulator::FileDescriptor takeSignals()
{
    sigset_t signals;
    sigemptyset(&signals);
    sigaddset(&signals, SIGTERM);
    sigaddset(&signals, SIGINT);
    sigprocmask(SIG_BLOCK, &signals, nullptr);
    return simulator::FileDescriptor(signalfd(-1, &signals, SFD_CLOEXEC | SFD_NONBLOCK));
}

} // namespace

int main(int argc, char **argv)
{
    simulator::Options options;
    if (const std::optional<int> status = simulator::parseOptions(argc, argv, options))
        return *status;
    try {
        simulator::EventLoop loop;
        const simulator::FileDescriptor signals = takeSignals();
        loop.watch(signals.get(), EPOLLIN, [&loop](std::uint32_t) { loop.stop(); });
        simulator::Services services(loop, options);
        if (!options.quiet)
            services.announce(std::cout, std::cerr);
        std::optional<simulator::LogPrinter> log;
        if (options.log) {
            std::signal(SIGPIPE, SIG_IGN); // who reads the log may go: the instrument stays
            log.emplace(loop, services.traffic(), STDOUT_FILENO);
        }
        loop.run();
        return 0;
    } catch (const std::exception &error) {
        std::cerr << "KyVisaSimulator: " << error.what() << '\n';
        return 1;
    }
}
