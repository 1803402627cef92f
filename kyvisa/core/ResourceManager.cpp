#include "kyvisa/core/ResourceManager.h"

#include "kyvisa/core/FindExpression.h"
#include "kyvisa/core/InstrumentSession.h"
#include "kyvisa/core/Library.h"
#include "kyvisa/core/ResourceName.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/transport/TransportFactory.h"

#include <cstring>

namespace kyvisa
{
namespace
{

ViStatus parseText(const ViChar *text, ResourceName &name)
{
    if (!text)
        return VI_ERROR_INV_RSRC_NAME;
    return parseResourceName({text, ::strnlen(text, MaxResourceName + 1)}, name);
}

} // namespace

ResourceManager::ResourceManager(Library &library) : m_library(library), m_attributes(kind::ResourceManager)
{
    m_attributes.setText(VI_ATTR_RSRC_NAME, "");
    m_attributes.setText(VI_ATTR_RSRC_CLASS, "RM");
    m_attributes.setText(VI_ATTR_RSRC_MANF_NAME, "Oltrava");
}

ViStatus ResourceManager::open(const ViChar *text, ViAccessMode accessMode, ViUInt32 timeout, ViSession &session)
{
    session = VI_NULL;
    ResourceName name;
    if (const ViStatus status = parseText(text, name); status < VI_SUCCESS)
        return status;
    if ((accessMode & ~static_cast<ViAccessMode>(VI_EXCLUSIVE_LOCK | VI_LOAD_CONFIG)) != 0)
        return VI_ERROR_INV_ACC_MODE;
    name = withTransportChosen(name);
    ViStatus status = VI_SUCCESS;
    const std::uint16_t kind = sessionKind(name, status);
    if (kind == 0)
        return status;

    const auto instrument = std::make_shared<InstrumentSession>(m_library, name, kind, m_handle);
    const ViSession handle = m_library.handles.insert(instrument, m_handle);
    if (handle == 0)
        return m_library.handles.find(m_handle) ? VI_ERROR_ALLOC : VI_ERROR_INV_OBJECT;
    try {
        status = instrument->open(handle, accessMode, timeout);
    } catch (const std::bad_alloc &) {
        status = VI_ERROR_ALLOC;
    }
    if (status < VI_SUCCESS) {
        // Whoever takes it out of the table closes it; the resource manager may have been closed meanwhile.
        if (ObjectPointer own = m_library.handles.remove(handle))
            dispose(std::move(own));
        return status;
    }
    session = handle;
    return status;
}

ViStatus ResourceManager::findResources(const ViChar *expression, ViFindList *findList, ViUInt32 *count, ViChar *first)
{
    if (findList)
        *findList = VI_NULL;
    if (count)
        *count = 0;
    if (!expression || !FindExpression::isValid(expression))
        return VI_ERROR_INV_EXPR;
    if (first)
        *first = '\0';
    return VI_ERROR_RSRC_NFOUND;
}

ViStatus ResourceManager::parse(const ViChar *text, ViUInt16 &interfaceType, ViUInt16 &board, ViChar *resourceClass,
                                ViChar *expandedName, ViChar *alias) const
{
    ResourceName name;
    if (const ViStatus status = parseText(text, name); status < VI_SUCCESS)
        return status;
    interfaceType = name.interfaceType;
    board = name.board;
    const auto copy = [](ViChar *to, const std::string &from) {
        if (to)
            std::memcpy(to, from.c_str(), from.size() + 1);
    };
    copy(resourceClass, name.className());
    copy(expandedName, name.canonical());
    copy(alias, "");
    return VI_SUCCESS;
}

ViStatus ResourceManager::getAttribute(ViAttr attribute, void *value)
{
    return m_attributes.get(attribute, value);
}

ViStatus ResourceManager::setAttribute(ViAttr attribute, ViAttrState state)
{
    const AttributeRow *row;
    std::int64_t value;
    const ViStatus status = m_attributes.check(attribute, state, row, value);
    if (status == VI_SUCCESS)
        m_attributes.setNumber(attribute, static_cast<ViUInt64>(value));
    return status;
}

ViStatus ResourceManager::close()
{
    for (ObjectPointer &child : m_library.handles.removeChildren(m_handle))
        dispose(std::move(child));
    return VI_SUCCESS;
}

} // namespace kyvisa
