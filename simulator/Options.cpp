#include "simulator/Options.h"

#include "simulator/instrument/Instrument.h"
#include "simulator/profile/ProfileFile.h"
#include "wire/Portmap.h"

#include <CLI/CLI.hpp>

#include <arpa/inet.h>

#include <algorithm>
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
constexpr std::size_t DefaultMaxClients = 64;
constexpr std::size_t MostClients = 100; ///< with all that comes on top below the usual limit of 1024 descriptors
constexpr unsigned LongestHandshake = 3600;
constexpr std::uint64_t MostMemory = std::uint64_t{64} << 30;

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

std::string checkFault(std::string &text)
{
    try {
        parseFaultSpec(text);
        return {};
    } catch (const FaultSpecError &error) {
        return error.what();
    }
}

} // namespace

std::optional<int> parseOptions(int argc, const char *const *argv, Options &options)
{
    std::vector<std::string> listen;
    options.maxMessage = InstrumentOptions{}.maxMessage;
    options.maxClients = DefaultMaxClients;
    options.seed = InstrumentOptions{}.seed;
    std::vector<std::string> faults;
    std::string profile;
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
    app.add_flag("--hislip-overlap", options.hislipOverlap,
                 "Prefer overlapped mode: HiSLIP sessions begin in it, and a device clear offers it");
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
    app.add_option("--http", options.http,
                   "Serve a web page that shows the instrument, and its LXI identification, on this port; 0 takes a "
                   "free one")
        ->type_name("PORT");
    app.add_flag("--serial", options.serial, "Have a serial port: a pseudo terminal, whose name is printed");
    app.add_flag(
        "--gpib", options.gateway,
        "Be a LAN/GPIB gateway too: VXI-11 device names gpib0 and gpib0,5 and more; brings VXI-11 when that is not "
        "asked for");
    app.add_flag("--gpib-refuse-docmd", options.refuseBusCommands,
                 "Be a gateway, as --gpib says, that refuses to control its bus (device_docmd), as some do");
    app.add_option("--max-message", options.maxMessage, "Longest program message in bytes (default: 1 GiB and 64 KiB)")
        ->type_name("BYTES")
        ->check(CLI::Range(LeastMaxMessage, MostMaxMessage));
    const CLI::Option *const maxMessageGiven = app.get_option("--max-message");
    app.add_option("--profile", profile,
                   "Be the instrument that this JSON file describes, or one that comes with the program: power-supply, "
                   "multimeter, oscilloscope")
        ->type_name("FILE");
    app.add_option("--fault", faults,
                   "Misbehave: PROTOCOL:KIND[:CONDITION...], for example hislip:drop-reply:p=0.01; may be repeated, "
                   "see the manual page")
        ->type_name("SPEC")
        ->allow_extra_args(false)
        ->check(CLI::Validator(checkFault, ""));
    app.add_option("--seed", options.seed, "Start of the random numbers of faults and readings (default: 1)")
        ->type_name("NUMBER")
        ->check(CLI::NonNegativeNumber);
    app.add_option("--memory", options.memory,
                   "Bytes that the files of the mass memory may have together (default: 2 GiB, or one message of the "
                   "longest size)")
        ->type_name("BYTES")
        ->check(CLI::Range(std::uint64_t{0}, MostMemory));
    app.add_flag("--signed-errors", options.signedErrors,
                 "Answer SYSTem:ERRor? with a sign in any case, as many instruments do: +0,\"No error\"");
    app.add_option("--max-clients", options.maxClients,
                   "Clients that HiSLIP, the raw socket and VXI-11 each take at once (default: 64)")
        ->type_name("NUMBER")
        ->check(CLI::Range(std::size_t{1}, MostClients));
    app.add_option("--handshake-timeout", options.handshakeTimeout,
                   "Seconds that a HiSLIP client may take for its first message, and again for its second connection "
                   "(default: 10 and 30)")
        ->type_name("SECONDS")
        ->check(CLI::Range(1u, LongestHandshake));
    app.add_flag("--mdns", options.mdns,
                 "Announce the services by multicast DNS on the interfaces that are listened on");
    app.add_flag("--log", options.log,
                 "Print every message, service request, clear, lock, trigger and poll, one line each, after \"ready\"");
    app.add_flag("--quiet", options.quiet, "Print nothing but errors, and what --log prints");
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

    if (faults.size() > Faults::Capacity) {
        std::cerr << "KyVisaSimulator: --fault: at most " << Faults::Capacity << " of them\nTry --help.\n";
        return 2;
    }

    if (app.get_option("--profile")->count() > 0) {
        try {
            options.profile = std::make_shared<const Profile>(loadProfile(profile));
        } catch (const ProfileFileError &error) {
            std::cerr << "KyVisaSimulator: --profile: " << error.what() << "\nTry --help.\n";
            return 2;
        }
        // What the command line says goes before what the profile says.
        if (maxMessageGiven->count() == 0)
            options.maxMessage = options.profile->maxMessage.value_or(options.maxMessage);
    }

    options.reportUnread = !ignoreUnread;
    options.gateway = options.gateway || options.refuseBusCommands;
    if (options.gateway && !options.vxi11)
        options.vxi11 = AnyPort;
    if (!options.hislip && !options.socket && !options.vxi11 && !options.portmapper && !options.serial) {
        options.hislip = DefaultHislipPort;
        options.socket = DefaultSocketPort;
        options.vxi11 = AnyPort;
    }
    if (options.vxi11 && !options.portmapper) {
        options.portmapper = wire::portmap::DefaultPort;
        options.portmapperIsOptional = true;
    }
    for (const std::string &fault : faults)
        options.faults.push_back(parseFaultSpec(fault));
    for (const std::string &address : listen)
        if (std::none_of(options.listen.begin(), options.listen.end(),
                         [&](const ListenAddress &known) { return known.text == address; }))
            options.listen.push_back({address, false});
    if (options.listen.empty())
        options.listen = {{"127.0.0.1", false}, {"::1", true}};
    return std::nullopt;
}

} // namespace simulator
