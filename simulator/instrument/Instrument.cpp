#include "simulator/instrument/Instrument.h"

#include "simulator/instrument/Commands.h"
#include "simulator/instrument/MessageExchange.h"

namespace simulator
{

void addBuiltInCommands(CommandTable &table, bool sourceMeasure)
{
    addCommonCommands(table);
    addSystemCommands(table);
    addStatusCommands(table);
    if (sourceMeasure) {
        addSourceMeasureCommands(table);
        addAcquisitionCommands(table);
    }
    addDisplayCommands(table);
    addMassMemoryCommands(table);
    addPowerCommands(table);
    addFaultCommands(table);
}

Instrument::Instrument(Timers &clock, InstrumentOptions options)
    : timers(clock), errors(options.errorQueue), operations(clock), locks(clock), massMemory(options.massMemory),
      sourceMeasure(clock, operations, status, options.seed), faults(options.seed, [this] { fillErrors(); }),
      // Room for what is stored and for two messages of the largest size on their way in.
      blocks(std::make_shared<ByteBudget>(options.massMemory + 2 * options.maxMessage)), m_options(std::move(options))
{
    addBuiltInCommands(commands, m_options.sourceMeasure);
}

Instrument::~Instrument()
{
    timers.cancel(m_publishTimer);
}

void Instrument::report(const ScpiError &error)
{
    status.setEvent(eventOfError(error.number));
    if (!errors.push(error))
        status.setEvent(eventOfError(ErrorQueue::Overflow));
}

/// A fault: errors until the queue has overflown. Clients see it a moment later, since one of them is being answered just now.
void Instrument::fillErrors()
{
    for (std::size_t i = 0; i <= m_options.errorQueue; ++i)
        report({-310, {}});
    if (m_publishTimer == Timers::None)
        m_publishTimer = timers.after({}, [this] {
            m_publishTimer = Timers::None;
            publishStatus();
        });
}

void Instrument::publishStatus()
{
    for (MessageExchange *exchange : m_exchanges)
        exchange->updateService();
}

void Instrument::reset()
{
    sourceMeasure.apply({});
    displayText.clear();
    profileSettings = profileDefaults;
}

void Instrument::powerCycle()
{
    for (MessageExchange *exchange : m_exchanges)
        exchange->forgetOperationComplete();
    reset();
    remote = {};
    errors.clear();
    status.clearEvents();
    // No reason for service is left: having been off is a new one.
    publishStatus();
    status.powerOn(powerOnClear);
}

} // namespace simulator
