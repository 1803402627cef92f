#pragma once

#include "simulator/instrument/Instrument.h"
#include "simulator/traffic/RecentTraffic.h"

#include <cstdint>
#include <string>
#include <vector>

namespace simulator
{

/// A way to the instrument.
struct ServedAt {
    std::string service;  ///< "hislip"
    std::string resource; ///< "TCPIP::127.0.0.1::hislip0,4880::INSTR"
};

/// Services among the lines that the simulator prints when it starts: those that end with a resource string.
std::vector<ServedAt> servicesIn(const std::vector<std::string> &startLines);

/**
 * What there is to see of an instrument at one moment, as values. Looking changes nothing: event registers keep their bits, readings their noise, and the error
 * queue its entries.
 */
struct InstrumentState {
    struct Channel {
        double voltage;      ///< set, V
        double currentLimit; ///< set, A
        bool output;
        double load;           ///< ohms
        double presentVoltage; ///< at the terminals
        double presentCurrent;
        bool limited;
    };
    struct Register {
        std::string name;
        unsigned value; ///< the condition, or the byte
        bool latched;   ///< has an event register beside its condition
        unsigned event; ///< latched; the same as value where there is but one
        unsigned enable;
        std::vector<std::string> bits; ///< names of those set in value
        std::vector<std::string> events;
    };
    struct Client {
        std::string protocol;
        std::string name;
        std::uint64_t messages; ///< that it has sent
    };
    struct File {
        std::string name;
        std::uint64_t size;
    };

    Identification identity;
    std::vector<ServedAt> services;
    std::vector<Channel> channels;                             ///< none where a profile goes without them
    std::vector<std::pair<std::string, std::string>> settings; ///< header and value of a profile's
    std::string acquisition;                                   ///< "idle", "waiting for trigger", "measuring"
    std::string remote;                                        ///< LOC, REM, RWL
    std::vector<Register> registers;
    std::size_t errors = 0;
    bool exclusivelyLocked = false;
    std::size_t lockHolders = 0;
    std::vector<Client> clients;
    std::vector<RecentTraffic::Line> messages; ///< oldest first
    std::vector<File> files;                   ///< at most MaxFiles of them
    std::size_t fileCount = 0;
    std::uint64_t memoryUsed = 0;
    std::uint64_t memoryFree = 0;

    static constexpr std::size_t MaxFiles = 100;
};

InstrumentState stateOf(const Instrument &instrument, const std::vector<std::string> &startLines);

} // namespace simulator
