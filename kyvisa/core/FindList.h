#pragma once

#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/core/Object.h"
#include "kyvisa/discovery/FoundResource.h"

#include <mutex>
#include <vector>

namespace kyvisa
{

/// The resources that a search found. next() steps through them; the find list's attributes describe the current one.
class FindList : public Object
{
public:
    /// @param found at least one; the first is the current one.
    explicit FindList(std::vector<FoundResource> found);

    /// Copies the next name, at most VI_FIND_BUFLEN bytes with its NUL. RSRC_NFOUND behind the last.
    ViStatus next(ViChar *name);

    ViStatus getAttribute(ViAttr attribute, void *value) override;
    ViStatus setAttribute(ViAttr attribute, ViAttrState value) override;
    ViStatus close() override;
    FindList *asFindList() override { return this; }

private:
    AttributeStore m_attributes;
    const std::vector<FoundResource> m_found;
    std::mutex m_mutex;
    std::size_t m_current = 0;
};

} // namespace kyvisa
