#include "simulator/instrument/Command.h"
#include "simulator/instrument/Commands.h"

namespace simulator
{
namespace
{

void addGroup(CommandTable &table, const std::string &name, RegisterGroup StatusModel::*group)
{
    const std::string header = "STATus:" + name;
    table.add(header + "[:EVENt]?", {},
              [=](Command &c) { c.response.integer((c.instrument.status.*group).takeEvent()); });
    table.add(header + ":CONDition?", {},
              [=](Command &c) { c.response.integer((c.instrument.status.*group).condition()); });

    const auto addMask = [&](const char *node, std::uint16_t RegisterGroup::*mask) {
        table.add(header + node, {1, 1}, [=](Command &c) {
            const auto value = static_cast<unsigned>(c.arguments.integer(0, 65535));
            (c.instrument.status.*group).*mask = static_cast<std::uint16_t>(value & RegisterGroup::Mask);
        });
        table.add(header + node + "?", {}, [=](Command &c) { c.response.integer((c.instrument.status.*group).*mask); });
    };
    addMask(":ENABle", &RegisterGroup::enable);
    addMask(":PTRansition", &RegisterGroup::positive);
    addMask(":NTRansition", &RegisterGroup::negative);
}

} // namespace

void addStatusCommands(CommandTable &table)
{
    addGroup(table, "OPERation", &StatusModel::operation);
    addGroup(table, "QUEStionable", &StatusModel::questionable);
    table.add("STATus:PRESet", {}, [](Command &c) {
        c.instrument.status.operation.preset();
        c.instrument.status.questionable.preset();
    });
}

} // namespace simulator
