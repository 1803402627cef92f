#include "kyvisa/core/ResourceManager.h"

#include "kyvisa/core/FindExpression.h"
#include "kyvisa/core/FindList.h"
#include "kyvisa/core/InstrumentSession.h"
#include "kyvisa/core/KnownResources.h"
#include "kyvisa/core/Library.h"
#include "kyvisa/core/ResourceName.h"
#include "kyvisa/core/Trace.h"
#include "kyvisa/discovery/LanDiscovery.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/SerialPorts.h"
#include "kyvisa/os/WaitLimit.h"
#include "kyvisa/transport/TransportFactory.h"

#include <algorithm>
#include <chrono>
#include <cstring>
#include <vector>

namespace kyvisa
{
namespace
{

constexpr std::chrono::milliseconds LongestFirstShare{5000};
constexpr ViUInt64 Vxi11Mode = 2; // bits of VI_KY_ATTR_TCPIP_FIND_RSRC_MODE
constexpr ViUInt64 MdnsMode = 4;

std::chrono::milliseconds firstShare(os::Deadline deadline)
{
    return deadline.isNever()
               ? LongestFirstShare
               : std::min(LongestFirstShare,
                          std::chrono::duration_cast<std::chrono::milliseconds>(deadline.remaining()) / 2);
}

ViStatus parseText(const ViChar *text, const Configuration &configuration, ResourceName &name)
{
    if (!text)
        return VI_ERROR_INV_RSRC_NAME;
    return parseNameOrAlias({text, ::strnlen(text, MaxResourceName + 1)}, configuration, name);
}

} // namespace

ResourceManager::ResourceManager(Library &library) : m_library(library), m_attributes(kind::ResourceManager)
{
    m_attributes.setText(VI_ATTR_RSRC_NAME, "");
    m_attributes.setText(VI_ATTR_RSRC_CLASS, "RM");
    m_attributes.setText(VI_ATTR_RSRC_MANF_NAME, "Oltrava");
    trace::switchTo(m_configuration.debug);
}

ViStatus ResourceManager::open(const ViChar *text, ViAccessMode accessMode, ViUInt32 timeout, ViSession &session)
{
    session = VI_NULL;
    ResourceName name;
    if (const ViStatus status = parseText(text, m_configuration, name); status < VI_SUCCESS)
        return status;
    if ((accessMode & ~static_cast<ViAccessMode>(VI_EXCLUSIVE_LOCK | VI_LOAD_CONFIG)) != 0)
        return VI_ERROR_INV_ACC_MODE;
    // Each protocol but the last leaves at least half of the time to those behind it: a host may be silent in one of them.
    const std::vector<ResourceName> choices = transportChoices(name, m_configuration);
    const auto deadline = os::Deadline::afterVisaTimeout(timeout == VI_TMO_IMMEDIATE ? DefaultOpenTimeout : timeout);
    ViStatus status = VI_ERROR_RSRC_NFOUND;
    for (const ResourceName &choice : choices) {
        const bool last = &choice == &choices.back();
        const auto connectBy = last ? deadline : os::Deadline::after(firstShare(deadline));
        const ViUInt32 left = timeout == VI_TMO_IMMEDIATE ? timeout : std::max(deadline.visaTimeoutLeft(), 1u);
        status = openAs(choice, accessMode, left, connectBy, session);
        if (status != VI_ERROR_RSRC_NFOUND && status != VI_ERROR_TMO)
            break;
    }
    return status;
}

ViStatus ResourceManager::openAs(const ResourceName &name, ViAccessMode accessMode, ViUInt32 timeout,
                                 os::Deadline connectBy, ViSession &session)
{
    ViStatus status = VI_SUCCESS;
    const std::uint16_t kind = sessionKind(name, status);
    if (kind == 0)
        return status;

    const auto instrument = std::make_shared<InstrumentSession>(m_library, name, kind, m_handle);
    const ViSession handle = m_library.handles.insert(instrument, m_handle);
    if (handle == 0)
        return m_library.handles.find(m_handle) ? VI_ERROR_ALLOC : VI_ERROR_INV_OBJECT;
    try {
        status = instrument->open(handle, accessMode, timeout, connectBy);
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
    if (first)
        *first = '\0';
    const auto parsed = expression ? FindExpression::parse(expression) : std::nullopt;
    if (!parsed)
        return VI_ERROR_INV_EXPR;
    std::vector<FoundResource> found = search(*parsed);
    if (found.empty())
        return VI_ERROR_RSRC_NFOUND;
    const std::string name = found.front().name;
    const auto size = static_cast<ViUInt32>(found.size());
    if (findList) {
        *findList = m_library.handles.insert(std::make_shared<FindList>(std::move(found)), m_handle);
        if (*findList == VI_NULL)
            return m_library.handles.find(m_handle) ? VI_ERROR_ALLOC : VI_ERROR_INV_OBJECT;
    }
    if (count)
        *count = size;
    if (first)
        std::memcpy(first, name.c_str(), name.size() + 1);
    return VI_SUCCESS;
}

/// Everything that is known or found and matches, without repetition.
std::vector<FoundResource> ResourceManager::search(const FindExpression &expression)
{
    std::vector<FoundResource> found = knownResources(m_configuration, os::serialPorts().size());
    // The network is left alone where none of its resources is wanted.
    if (expression.mayMatch("TCPIP"))
        addResources(found, searchLan());
    std::erase_if(found, [&](const FoundResource &resource) { return !expression.matches(resource.name); });
    return found;
}

std::vector<FoundResource> ResourceManager::searchLan()
{
    const ViUInt64 mode = m_attributes.number(VI_KY_ATTR_TCPIP_FIND_RSRC_MODE);
    const DiscoveryMethods methods{(mode & MdnsMode) != 0, (mode & Vxi11Mode) != 0};
    if (!methods.any())
        return {};
    const auto wakeup = std::make_shared<os::Wakeup>();
    if (!wakeup->valid())
        return {};
    {
        const std::lock_guard lock(m_mutex);
        if (m_closed)
            return {};
        std::erase_if(m_searches, [](const auto &search) { return search.expired(); });
        m_searches.push_back(wakeup);
    }
    const auto timeout = static_cast<ViUInt32>(m_attributes.number(VI_KY_ATTR_TCPIP_FIND_RSRC_TMO));
    return discoverLan(methods, {os::Deadline::afterVisaTimeout(timeout), *wakeup});
}

ViStatus ResourceManager::parse(const ViChar *text, ViUInt16 &interfaceType, ViUInt16 &board, ViChar *resourceClass,
                                ViChar *expandedName, ViChar *alias) const
{
    ResourceName name;
    if (const ViStatus status = parseText(text, m_configuration, name); status < VI_SUCCESS)
        return status;
    interfaceType = name.interfaceType;
    board = name.board;
    const auto copy = [](ViChar *to, const std::string &from) {
        if (to)
            std::memcpy(to, from.c_str(), from.size() + 1);
    };
    copy(resourceClass, name.className());
    copy(expandedName, name.canonical());
    copy(alias, aliasOf(name.canonical(), m_configuration));
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
    {
        const std::lock_guard lock(m_mutex);
        m_closed = true;
        for (const auto &search : m_searches)
            if (const auto wakeup = search.lock())
                wakeup->close();
    }
    for (ObjectPointer &child : m_library.handles.removeChildren(m_handle))
        dispose(std::move(child));
    return VI_SUCCESS;
}

} // namespace kyvisa
