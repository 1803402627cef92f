#include "simulator/Options.h"

#include "simulator/instrument/Instrument.h"
#include "wire/Portmap.h"

#include <CLI/CLI.hpp>

#include <arpa/inet.h>

#include <iostream>

namespace simulator
{
namespace
{

constexpr std::uint16_t DefaultHislipPort = 4880;
constexpr std::uint16_t DefaultSocketPort = 5025;
constexpr std::uint16_t AnyPort = 0; ///< VXI-11 has none of its own: clients ask the portmapper
constexpr std::size_t LeastMaxMessage = 1024;
constexpr std::size_t MostMaxMessage = std::size_t{16} << 30;

/// `localhost` stands for itself and not for what a name service makes of it.
std::string checkAddress(std::string &address)
{
    if (address == "localhost")
        address = "127.0.0.1";
    if (address.size() > 2 && address.front() == '[' && address.back() == ']')
        address = address.substr(1, address.size() - 2);
    in6_addr bytes;
    if (::inet_pton(AF_INET, address.c_str(), &bytes) == 1 || ::inet_pton(AF_INET6, address.c_str(), &bytes) == 1)
        return {};
    return "not an IPv4 or IPv6 address: " + address;
}

} // namespace

std::optional<int> parseOptions(int argc, const char *const *argv, Options &options)
{
    std::vector<std::string> listen;
    options.maxMessage = InstrumentOptions{}.maxMessage;
    bool ignoreUnread = false;

    CLI::App app{
        "A simulated instrument for VISA programs: IEEE 488.2 and SCPI over HiSLIP, VXI-11 and raw sockets.\n"
        "Without any service option it serves HiSLIP on port 4880, the raw socket on port 5025, and VXI-11 with a "
        "portmapper on port 111 where that may be had."};
    app.name("KyVisaSimulator");
    app.add_option("--listen", listen,
                   "Address to listen on, may be repeated (default: 127.0.0.1 and, where there is one, ::1)")
        ->type_name("ADDRESS")
        ->allow_extra_args(false)
        ->transform(CLI::Validator(checkAddress, ""));
    app.add_option("--hislip", options.hislip, "Serve HiSLIP on this port; 0 takes a free one")->type_name("PORT");
    app.add_flag("--hislip-ignore-unread", ignoreUnread,
                 "Report no -410 for an unread HiSLIP response, for clients that never say that they have read one");
    app.add_option("--socket", options.socket, "Serve the raw socket on this port; 0 takes a free one")
        ->type_name("PORT");
    app.add_option("--vxi11", options.vxi11,
                   "Serve VXI-11 on this port; 0 takes a free one. Without --portmapper also a portmapper on port 111, "
                   "where that may be had")
        ->type_name("PORT");
    app.add_option("--portmapper", options.portmapper,
                   "Serve a portmapper, which tells clients the port of VXI-11, on this TCP and UDP port; 0 takes a "
                   "free one")
        ->type_name("PORT");
    app.add_option("--max-message", options.maxMessage, "Longest program message in bytes (default: 1 GiB and 64 KiB)")
        ->type_name("BYTES")
        ->check(CLI::Range(LeastMaxMessage, MostMaxMessage));
    app.add_flag("--quiet", options.quiet, "Print nothing but errors");
    app.set_help_flag("--help", "Print this help and exit");
    app.set_version_flag("--version", "KyVisaSimulator " KYVISA_VERSION, "Print the version and exit");

    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError &error) {
        if (error.get_exit_code() == 0) {
            app.exit(error, std::cout, std::cerr);
            return 0;
        }
        std::cerr << "KyVisaSimulator: " << error.what() << "\nTry --help.\n";
        return 2;
    }

    options.reportUnread = !ignoreUnread;
    if (!options.hislip && !options.socket && !options.vxi11 && !options.portmapper) {
        options.hislip = DefaultHislipPort;
        options.socket = DefaultSocketPort;
        options.vxi11 = AnyPort;
    }
    if (options.vxi11 && !options.portmapper) {
        options.portmapper = wire::portmap::DefaultPort;
        options.portmapperIsOptional = true;
    }
    for (const std::string &address : listen)
        options.listen.push_back({address, false});
    if (options.listen.empty())
        options.listen = {{"127.0.0.1", false}, {"::1", true}};
    return std::nullopt;
}

} // namespace simulator
