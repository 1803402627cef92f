#pragma once

#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/core/Configuration.h"
#include "kyvisa/core/Object.h"
#include "kyvisa/discovery/FoundResource.h"
#include "kyvisa/os/Deadline.h"

#include <memory>
#include <mutex>
#include <vector>

namespace kyvisa
{

class FindExpression;
class Library;
struct ResourceName;
namespace os
{
class Wakeup;
}

/**
 * A resource manager session: opens and finds. What is opened or found through it is its child in the handle table, and
 * closing it closes them.
 */
class ResourceManager : public Object
{
public:
    explicit ResourceManager(Library &library);

    /// The handle is known once the object is in the table.
    void setHandle(ViSession handle) { m_handle = handle; }

    ViStatus open(const ViChar *name, ViAccessMode accessMode, ViUInt32 timeout, ViSession &session);
    /// @param findList may be null: then nothing is kept.
    ViStatus findResources(const ViChar *expression, ViFindList *findList, ViUInt32 *count, ViChar *first);
    ViStatus parse(const ViChar *name, ViUInt16 &interfaceType, ViUInt16 &board, ViChar *resourceClass,
                   ViChar *expandedName, ViChar *alias) const;

    ViStatus getAttribute(ViAttr attribute, void *value) override;
    ViStatus setAttribute(ViAttr attribute, ViAttrState value) override;
    ViStatus close() override;
    void abandon() override { close(); }
    ResourceManager *asResourceManager() override { return this; }

private:
    ViStatus openAs(const ResourceName &name, ViAccessMode accessMode, ViUInt32 timeout, os::Deadline connectBy,
                    ViSession &session);

    std::vector<FoundResource> search(const FindExpression &expression);
    std::vector<FoundResource> searchLan();

    Library &m_library;
    const Configuration m_configuration = readConfiguration();
    AttributeStore m_attributes;
    ViSession m_handle = 0;

    std::mutex m_mutex;
    std::vector<std::weak_ptr<os::Wakeup>> m_searches; ///< those that go on, each on its caller's thread
    bool m_closed = false;
};

} // namespace kyvisa
