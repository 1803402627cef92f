#pragma once

#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/core/Object.h"

#include <atomic>

namespace kyvisa
{

class Library;

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
    Library &m_library;
    AttributeStore m_attributes;
    ViSession m_handle = 0;
};

} // namespace kyvisa
