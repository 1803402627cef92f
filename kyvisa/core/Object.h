#pragma once

#include "kyvisa/include/visatype.h"
#include "kyvisa/os/ForkEpoch.h"

#include <cstdint>
#include <memory>

namespace kyvisa
{

class ResourceManager;
class InstrumentSession;
class FindList;
class Object;

using ObjectPointer = std::shared_ptr<Object>;

/**
 * What a handle stands for. The handle table holds one reference, each call that works on the object another: an object
 * that is closed while a call is inside lives until that call has left.
 */
class Object
{
public:
    virtual ~Object() = default;

    /// Made by a process of which this one is a fork.
    bool inherited() const { return m_epoch != os::forkEpoch(); }

    virtual ViStatus getAttribute(ViAttr attribute, void *value) = 0;
    virtual ViStatus setAttribute(ViAttr attribute, ViAttrState value) = 0;

    /// Called once, by whoever took the object out of the table, with no lock held. Wakes and ends what is going on.
    virtual ViStatus close() = 0;
    /// Instead of close() for an inherited object: frees what can be freed without telling anybody. Its threads are not
    /// here, and its locks may be held for ever.
    virtual void abandon() {}

    /// Closes an object that was taken out of the table, in whichever way its process allows.
    static ViStatus dispose(ObjectPointer object);

    virtual ResourceManager *asResourceManager() { return nullptr; }
    virtual InstrumentSession *asInstrument() { return nullptr; }
    virtual FindList *asFindList() { return nullptr; }

private:
    const std::uint32_t m_epoch = os::forkEpoch();
};

} // namespace kyvisa
