#pragma once

#include "simulator/fault/Faults.h"
#include "simulator/instrument/CommandTable.h"
#include "simulator/instrument/ErrorQueue.h"
#include "simulator/instrument/InputBuffer.h"
#include "simulator/instrument/LockTable.h"
#include "simulator/instrument/MassMemory.h"
#include "simulator/instrument/Operations.h"
#include "simulator/instrument/RemoteState.h"
#include "simulator/instrument/SourceMeasure.h"
#include "simulator/instrument/StatusModel.h"
#include "simulator/traffic/TrafficLog.h"

#include <array>
#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace simulator
{

class MessageExchange;

/// What the instrument calls itself, over every protocol.
struct Identification {
    std::string manufacturer = "Oltrava";
    std::string model = "KyVisaSimulator";
    std::string serial = "100001";
    std::string firmware = "0";
};

struct InstrumentOptions {
    Identification identification;
    std::uint64_t seed = 1;
    std::size_t maxMessage = (std::size_t{1} << 30) + (std::size_t{1} << 16); ///< bytes of one program message
    std::uint64_t massMemory = std::uint64_t{2} << 30;
    std::size_t errorQueue = ErrorQueue::Capacity;
    bool sourceMeasure = true; ///< it has the source and measure commands
    bool signedErrors = false; ///< SYSTem:ERRor? answers +0 where there is none
};

/**
 * The one instrument behind all protocols: settings, status registers, error queue, mass memory and locks. What each client has of its own, from its input
 * buffer to its output queue, is its MessageExchange.
 *
 * Everything runs on one thread, that of the timers. A client's command runs to its end before another one's begins, unless it waits.
 */
class Instrument
{
public:
    static constexpr std::size_t Memories = 10; ///< of *SAV and *RCL

    struct Memory {
        SourceMeasure::Settings settings;
        std::vector<double> profileSettings;
    };

    Instrument(Timers &timers, InstrumentOptions options);
    ~Instrument();
    Instrument(const Instrument &) = delete;
    Instrument &operator=(const Instrument &) = delete;

    const InstrumentOptions &options() const { return m_options; }
    const Identification &identification() const { return m_options.identification; }

    /// Queues the error and sets its event bit.
    void report(const ScpiError &error);
    /// The shared bits of the status byte.
    std::uint8_t statusSummary() const { return status.summary(!errors.empty()); }
    /// Lets every client see a change of the status registers. Each unit ends with it.
    void publishStatus();

    /// *RST: settings as after power-on, operations aborted; status, errors, files and locks stay.
    void reset();
    /// The power goes and comes back; what needs none stays: files, *SAV, *PSC, and with *PSC 0 the enables. The clients stay connected.
    void powerCycle();
    /// *TRG, a group execute trigger, or the trigger message of a protocol.
    void trigger() { sourceMeasure.acquisition.busTrigger(); }

    void attach(MessageExchange &exchange) { m_exchanges.insert(&exchange); }
    void detach(MessageExchange &exchange) { m_exchanges.erase(&exchange); }

    Timers &timers;
    TrafficLog traffic;
    StatusModel status;
    ErrorQueue errors;
    Operations operations;
    LockTable locks;
    RemoteState remote;
    MassMemory massMemory;
    SourceMeasure sourceMeasure;
    CommandTable commands;
    Faults faults;
    std::shared_ptr<ByteBudget> blocks; ///< memory for blocks on their way in and for files
    std::array<std::optional<Memory>, Memories> memories;
    std::vector<double> profileSettings;       ///< of a profile's settings, the channels of each one after the other
    std::vector<double> profileDefaults;       ///< what they are after a reset
    std::function<std::string()> learnProfile; ///< units that bring them back, each with a leading ";:"; may be empty
    bool powerOnClear = true;
    std::string displayText;

private:
    void fillErrors();

    Timers::Id m_publishTimer = Timers::None;
    InstrumentOptions m_options;
    std::set<MessageExchange *> m_exchanges;
};

} // namespace simulator
