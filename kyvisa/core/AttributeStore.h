#pragma once

#include "kyvisa/core/AttributeTable.h"

#include <array>
#include <atomic>
#include <map>
#include <string>

namespace kyvisa
{

/**
 * The attribute values of one object: the table's rows of its kind.
 *
 * Numbers may be read and set by any thread at any time. Texts are set while the object is being made, before its handle
 * is known to anybody.
 */
class AttributeStore
{
public:
    explicit AttributeStore(std::uint16_t kind);

    std::uint16_t kind() const { return m_kind; }

    /// Writes exactly the attribute's width, or its text. NSUP_ATTR where this kind does not have it.
    ViStatus get(ViAttr attribute, void *value) const;

    /// Checks @p state by the table and answers the row and the value to store. Stores nothing.
    ViStatus check(ViAttr attribute, ViAttrState state, const AttributeRow *&row, std::int64_t &value) const;

    // For the library itself: no checks.
    ViUInt64 number(ViAttr attribute) const;
    void setNumber(ViAttr attribute, ViUInt64 value);
    std::string text(ViAttr attribute) const;
    void setText(ViAttr attribute, std::string value);

private:
    std::uint16_t m_kind;
    std::array<std::atomic<ViUInt64>, AttributeCount> m_numbers;
    std::map<ViAttr, std::string> m_texts;
};

} // namespace kyvisa
