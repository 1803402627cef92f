#include "kyvisa/core/FindExpression.h"

#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/core/ResourceDescription.h"
#include "kyvisa/core/ResourceName.h"
#include "kyvisa/core/TextReader.h"
#include "kyvisa/include/visa.h"

#include <algorithm>

namespace kyvisa
{
namespace
{

/// The global attributes that are known of a resource without opening it.
constexpr std::pair<std::string_view, ViAttr> GlobalNames[] = {
    {"VI_ATTR_RSRC_NAME", VI_ATTR_RSRC_NAME},
    {"VI_ATTR_RSRC_CLASS", VI_ATTR_RSRC_CLASS},
    {"VI_ATTR_RSRC_MANF_NAME", VI_ATTR_RSRC_MANF_NAME},
    {"VI_ATTR_RSRC_MANF_ID", VI_ATTR_RSRC_MANF_ID},
    {"VI_ATTR_RSRC_IMPL_VERSION", VI_ATTR_RSRC_IMPL_VERSION},
    {"VI_ATTR_RSRC_SPEC_VERSION", VI_ATTR_RSRC_SPEC_VERSION},
    {"VI_ATTR_INTF_TYPE", VI_ATTR_INTF_TYPE},
    {"VI_ATTR_INTF_NUM", VI_ATTR_INTF_NUM},
    {"VI_ATTR_INTF_INST_NAME", VI_ATTR_INTF_INST_NAME},
    {"VI_ATTR_TCPIP_HOSTNAME", VI_ATTR_TCPIP_HOSTNAME},
    {"VI_ATTR_TCPIP_DEVICE_NAME", VI_ATTR_TCPIP_DEVICE_NAME},
    {"VI_ATTR_TCPIP_PORT", VI_ATTR_TCPIP_PORT},
    {"VI_ATTR_TCPIP_IS_HISLIP", VI_ATTR_TCPIP_IS_HISLIP},
    {"VI_ATTR_GPIB_PRIMARY_ADDR", VI_ATTR_GPIB_PRIMARY_ADDR},
    {"VI_ATTR_GPIB_SECONDARY_ADDR", VI_ATTR_GPIB_SECONDARY_ADDR},
    {"VI_ATTR_ASRL_BAUD", VI_ATTR_ASRL_BAUD},
    {"VI_ATTR_ASRL_DATA_BITS", VI_ATTR_ASRL_DATA_BITS},
    {"VI_ATTR_ASRL_PARITY", VI_ATTR_ASRL_PARITY},
    {"VI_ATTR_ASRL_STOP_BITS", VI_ATTR_ASRL_STOP_BITS},
    {"VI_ATTR_ASRL_FLOW_CNTRL", VI_ATTR_ASRL_FLOW_CNTRL},
};

std::optional<AttributeCondition::Value> valueOf(const AttributeStore &attributes, std::string_view name)
{
    const auto *entry = std::find_if(std::begin(GlobalNames), std::end(GlobalNames),
                                     [&](const auto &candidate) { return candidate.first == name; });
    const AttributeRow *row =
        entry != std::end(GlobalNames) ? findAttribute(entry->second, attributes.kind()) : nullptr;
    if (!row)
        return std::nullopt;
    if (row->type == AttributeType::Text)
        return attributes.text(row->id);
    return static_cast<std::int64_t>(attributes.number(row->id));
}

} // namespace

std::optional<FindExpression> FindExpression::parse(std::string_view text)
{
    if (text.size() > LongestExpression)
        return std::nullopt;
    TextReader patternReader(text);
    auto pattern = ResourcePattern::parse(patternReader);
    if (!pattern)
        return std::nullopt;
    if (patternReader.atEnd())
        return FindExpression(*std::move(pattern), std::nullopt);
    std::string_view condition = patternReader.rest();
    if (condition.size() < 2 || condition.back() != '}')
        return std::nullopt;
    TextReader conditionReader(condition.substr(1, condition.size() - 2));
    auto parsed = AttributeCondition::parse(conditionReader);
    return parsed ? std::optional(FindExpression(*std::move(pattern), std::move(parsed))) : std::nullopt;
}

bool FindExpression::matches(std::string_view resource) const
{
    if (!m_pattern.matches(resource))
        return false;
    if (!m_condition)
        return true;
    ResourceName name;
    if (parseResourceName(resource, name) < VI_SUCCESS)
        return false;
    AttributeStore attributes(kindOf(name));
    describeResource(name, attributes);
    return m_condition->holds([&](std::string_view attribute) { return valueOf(attributes, attribute); });
}

} // namespace kyvisa
