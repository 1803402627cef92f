#include "simulator/instrument/Command.h"
#include "simulator/instrument/Commands.h"

#include <chrono>

namespace simulator
{
namespace
{

constexpr Numeric DelaySeconds{"S", 0, 3600, 0};

void allErrors(Command &command)
{
    ErrorQueue &errors = command.instrument.errors;
    do
        command.response.plain(errorResponse(errors.pop()));
    while (!errors.empty());
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
    table.add("SYSTem:ERRor[:NEXT]?", {},
              [](Command &c) { c.response.plain(errorResponse(c.instrument.errors.pop())); });
    table.add("SYSTem:ERRor:COUNt?", {},
              [](Command &c) { c.response.integer(static_cast<std::int64_t>(c.instrument.errors.size())); });
    table.add("SYSTem:ERRor:ALL?", {}, allErrors);
    table.add("SYSTem:VERSion?", {}, [](Command &c) { c.response.plain("1999.0"); });
    table.add("SYSTem:DELay", {1, 1}, delay);
    table.add("SYSTem:REMote[:STATe]?", {}, [](Command &c) { c.response.plain(c.instrument.remote.name()); });
}

} // namespace simulator
