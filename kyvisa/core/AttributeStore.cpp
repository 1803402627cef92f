#include "kyvisa/core/AttributeStore.h"

#include "kyvisa/include/visa.h"

#include <cstring>

namespace kyvisa
{
namespace
{

std::size_t indexOf(const AttributeRow *row)
{
    return static_cast<std::size_t>(row - attributeTable().data());
}

/// Stores the low bytes of @p value as an integer of @p width bytes.
void storeNumber(void *to, ViUInt64 value, std::size_t width)
{
    const auto copy = [to](auto number) { std::memcpy(to, &number, sizeof number); };
    switch (width) {
    case 1:
        return copy(static_cast<ViUInt8>(value));
    case 2:
        return copy(static_cast<ViUInt16>(value));
    case 4:
        return copy(static_cast<ViUInt32>(value));
    default:
        return copy(value);
    }
}

} // namespace

AttributeStore::AttributeStore(std::uint16_t kind) : m_kind(kind)
{
    for (const AttributeRow &row : attributeTable())
        m_numbers[indexOf(&row)].store(static_cast<ViUInt64>(row.initial), std::memory_order_relaxed);
}

ViStatus AttributeStore::get(ViAttr attribute, void *value) const
{
    const AttributeRow *row = findAttribute(attribute, m_kind);
    if (!row)
        return VI_ERROR_NSUP_ATTR;
    if (!value)
        return VI_ERROR_INV_PARAMETER;
    if (row->type != AttributeType::Text) {
        storeNumber(value, m_numbers[indexOf(row)].load(std::memory_order_relaxed), row->width());
        return VI_SUCCESS;
    }
    const auto found = m_texts.find(attribute);
    if (found == m_texts.end())
        return VI_ERROR_NSUP_ATTR;
    std::memcpy(value, found->second.c_str(), found->second.size() + 1);
    return VI_SUCCESS;
}

ViStatus AttributeStore::check(ViAttr attribute, ViAttrState state, const AttributeRow *&row, std::int64_t &value) const
{
    row = findAttribute(attribute, m_kind);
    if (!row)
        return VI_ERROR_NSUP_ATTR;
    if (row->access == Access::ReadOnly)
        return VI_ERROR_ATTR_READONLY;
    if (!row->convert(state, value) || !row->accepts(value))
        return VI_ERROR_NSUP_ATTR_STATE;
    return VI_SUCCESS;
}

ViUInt64 AttributeStore::number(ViAttr attribute) const
{
    const AttributeRow *row = findAttribute(attribute, m_kind);
    return row ? m_numbers[indexOf(row)].load(std::memory_order_relaxed) : 0;
}

void AttributeStore::setNumber(ViAttr attribute, ViUInt64 value)
{
    if (const AttributeRow *row = findAttribute(attribute, m_kind))
        m_numbers[indexOf(row)].store(value, std::memory_order_relaxed);
}

std::string AttributeStore::text(ViAttr attribute) const
{
    const auto found = m_texts.find(attribute);
    return found == m_texts.end() ? std::string() : found->second;
}

void AttributeStore::setText(ViAttr attribute, std::string value)
{
    value.resize(std::min(value.size(), MaxAttributeText - 1));
    m_texts[attribute] = std::move(value);
}

} // namespace kyvisa
