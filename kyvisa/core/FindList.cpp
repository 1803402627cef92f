#include "kyvisa/core/FindList.h"

#include "kyvisa/include/visa.h"

#include <cstring>

namespace kyvisa
{

FindList::FindList(std::vector<std::string> names) : m_attributes(kind::FindListObject), m_names(std::move(names)) {}

ViStatus FindList::next(ViChar *name)
{
    const std::lock_guard lock(m_mutex);
    if (m_current + 1 >= m_names.size())
        return VI_ERROR_RSRC_NFOUND;
    const std::string &found = m_names[++m_current];
    std::memcpy(name, found.c_str(), found.size() + 1);
    return VI_SUCCESS;
}

ViStatus FindList::getAttribute(ViAttr attribute, void *value)
{
    return m_attributes.get(attribute, value);
}

ViStatus FindList::setAttribute(ViAttr attribute, ViAttrState value)
{
    const AttributeRow *row;
    std::int64_t number;
    return m_attributes.check(attribute, value, row, number);
}

ViStatus FindList::close()
{
    return VI_SUCCESS;
}

} // namespace kyvisa
