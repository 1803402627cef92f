#pragma once

#include "simulator/instrument/CommandTable.h"
#include "simulator/instrument/ErrorQueue.h"
#include "simulator/instrument/InputBuffer.h"
#include "simulator/instrument/LockTable.h"
#include "simulator/instrument/MassMemory.h"
#include "simulator/instrument/Operations.h"
#include "simulator/instrument/RemoteState.h"
#include "simulator/instrument/SourceMeasure.h"
#include "simulator/instrument/StatusModel.h"

#include <array>
#include <memory>
#include <optional>
#include <set>
#include <string>

namespace simulator
{

class MessageExchange;

struct InstrumentOptions {
    std::string version = "0";
    std::string serial = "100001";
    std::uint64_t seed = 1;
    std::size_t maxMessage = (std::size_t{1} << 30) + (std::size_t{1} << 16); ///< bytes of one program message
    std::uint64_t massMemory = std::uint64_t{2} << 30;
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

    Instrument(Timers &timers, InstrumentOptions options);

    const InstrumentOptions &options() const { return m_options; }
    std::string identification() const;

    /// Queues the error and sets its event bit.
    void report(const ScpiError &error);
    /// The shared bits of the status byte.
    std::uint8_t statusSummary() const { return status.summary(!errors.empty()); }
    /// Lets every client see a change of the status registers. Each unit ends with it.
    void publishStatus();

    /// *RST: settings as after power-on, operations aborted; status, errors, files and locks stay.
    void reset();
    /// *TRG, a group execute trigger, or the trigger message of a protocol.
    void trigger() { sourceMeasure.trigger(); }

    void attach(MessageExchange &exchange) { m_exchanges.insert(&exchange); }
    void detach(MessageExchange &exchange) { m_exchanges.erase(&exchange); }

    Timers &timers;
    StatusModel status;
    ErrorQueue errors;
    Operations operations;
    LockTable locks;
    RemoteState remote;
    MassMemory massMemory;
    SourceMeasure sourceMeasure;
    CommandTable commands;
    std::shared_ptr<ByteBudget> blocks; ///< memory for blocks on their way in and for files
    std::array<std::optional<SourceMeasure::Settings>, Memories> memories;
    bool powerOnClear = true;

private:
    InstrumentOptions m_options;
    std::set<MessageExchange *> m_exchanges;
};

} // namespace simulator
