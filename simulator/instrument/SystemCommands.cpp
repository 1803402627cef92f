#include "simulator/instrument/Command.h"
#include "simulator/instrument/Commands.h"

#include <chrono>

namespace simulator
{
namespace
{

constexpr Numeric DelaySeconds{"S", 0, 3600, 0};

/// Removes the oldest error and answers it, as a whole or its number alone.
void answerError(Command &command)
{
    command.response.plain(errorResponse(command.instrument.errors.pop(), command.instrument.options().signedErrors));
}

void answerCode(Command &command)
{
    command.response.plain(
        errorNumber(command.instrument.errors.pop().number, command.instrument.options().signedErrors));
}

void allCodes(Command &command)
{
    do
        answerCode(command);
    while (!command.instrument.errors.empty());
}

void allErrors(Command &command)
{
    do
        answerError(command);
    while (!command.instrument.errors.empty());
}

/// Keeps the client waiting, as a command does that takes its time. Other clients go on.
void delay(Command &command)
{
    const std::chrono::duration<double> time{command.arguments.number(DelaySeconds)};
    command.exchange.holdFor(std::chrono::duration_cast<std::chrono::nanoseconds>(time), [](ResponseUnit &) {});
}

} // namespace

void addSystemCommands(CommandTable &table)
{
    table.add("SYSTem:ERRor[:NEXT]?", {}, answerError);
    table.add("SYSTem:ERRor:CODE[:NEXT]?", {}, answerCode);
    table.add("SYSTem:ERRor:CODE:ALL?", {}, allCodes);
    table.add("SYSTem:ERRor:COUNt?", {},
              [](Command &c) { c.response.integer(static_cast<std::int64_t>(c.instrument.errors.size())); });
    table.add("SYSTem:ERRor:ALL?", {}, allErrors);
    table.add("SYSTem:PRESet", {}, [](Command &c) { c.instrument.reset(); });
    table.add("SYSTem:VERSion?", {}, [](Command &c) { c.response.plain("1999.0"); });
    table.add("SYSTem:DELay", {1, 1}, delay);
    table.add("SYSTem:REMote[:STATe]?", {}, [](Command &c) { c.response.plain(c.instrument.remote.name()); });
}

} // namespace simulator
