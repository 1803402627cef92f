#include "simulator/instrument/Instrument.h"

#include "simulator/instrument/Commands.h"
#include "simulator/instrument/MessageExchange.h"

namespace simulator
{

Instrument::Instrument(Timers &clock, InstrumentOptions options)
    : timers(clock), operations(clock), locks(clock), massMemory(options.massMemory),
      sourceMeasure(clock, operations, status, options.seed),
      // Room for what is stored and for two messages of the largest size on their way in.
      blocks(std::make_shared<ByteBudget>(options.massMemory + 2 * options.maxMessage)), m_options(std::move(options))
{
    addCommonCommands(commands);
    addSystemCommands(commands);
    addStatusCommands(commands);
    addSourceMeasureCommands(commands);
    addMassMemoryCommands(commands);
}

std::string Instrument::identification() const
{
    return "Oltrava,KyVisaSimulator," + m_options.serial + "," + m_options.version;
}

void Instrument::report(const ScpiError &error)
{
    status.setEvent(eventOfError(error.number));
    errors.push(error);
}

void Instrument::publishStatus()
{
    for (MessageExchange *exchange : m_exchanges)
        exchange->updateService();
}

void Instrument::reset()
{
    sourceMeasure.abort();
    sourceMeasure.apply({});
}

} // namespace simulator
