#include "kyvisa/core/FindList.h"

#include "kyvisa/include/visa.h"

#include <algorithm>
#include <cstring>

namespace kyvisa
{

namespace
{

const std::string *textOf(const LxiTexts &texts, ViAttr attribute)
{
    switch (attribute) {
    case VI_KY_ATTR_LXI_MANF:
        return &texts.manufacturer;
    case VI_KY_ATTR_LXI_MODEL:
        return &texts.model;
    case VI_KY_ATTR_LXI_SERIAL:
        return &texts.serialNumber;
    case VI_KY_ATTR_LXI_VERSION:
        return &texts.version;
    case VI_KY_ATTR_LXI_DESCRIPTION:
        return &texts.description;
    case VI_KY_ATTR_LXI_HOSTNAME:
        return &texts.hostName;
    default:
        return nullptr;
    }
}

} // namespace

FindList::FindList(std::vector<FoundResource> found) : m_attributes(kind::FindListObject), m_found(std::move(found)) {}

ViStatus FindList::next(ViChar *name)
{
    const std::lock_guard lock(m_mutex);
    if (m_current + 1 >= m_found.size())
        return VI_ERROR_RSRC_NFOUND;
    const std::string &found = m_found[++m_current].name;
    std::memcpy(name, found.c_str(), found.size() + 1);
    return VI_SUCCESS;
}

/// The LXI texts are those of the resource that was handed out last. One that nobody told is not supported.
ViStatus FindList::getAttribute(ViAttr attribute, void *value)
{
    const std::lock_guard lock(m_mutex);
    const std::string *text = textOf(m_found[m_current].texts, attribute);
    if (!text || !value)
        return m_attributes.get(attribute, value);
    if (text->empty())
        return VI_ERROR_NSUP_ATTR;
    const std::size_t length = std::min(text->size(), MaxAttributeText - 1);
    std::memcpy(value, text->data(), length);
    static_cast<char *>(value)[length] = '\0';
    return VI_SUCCESS;
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
