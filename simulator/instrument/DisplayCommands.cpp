#include "simulator/instrument/Command.h"
#include "simulator/instrument/Commands.h"

namespace simulator
{
namespace
{
constexpr std::size_t DisplayWidth = 40;
}

void addDisplayCommands(CommandTable &table)
{
    table.add("DISPlay[:WINDow]:TEXT[:DATA]", {1, 1}, [](Command &c) {
        std::string text = c.arguments.string();
        if (text.size() > DisplayWidth)
            throw ScpiError{-223, std::to_string(DisplayWidth) + " characters fit"};
        c.instrument.displayText = std::move(text);
    });
    table.add("DISPlay[:WINDow]:TEXT[:DATA]?", {}, [](Command &c) { c.response.string(c.instrument.displayText); });
    table.add("DISPlay[:WINDow]:TEXT:CLEar", {}, [](Command &c) { c.instrument.displayText.clear(); });
}

} // namespace simulator
