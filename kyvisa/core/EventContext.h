#pragma once

#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/core/Object.h"

namespace kyvisa
{

struct Event;

/// An event that was delivered: the attributes of one occurrence.
class EventContext : public Object
{
public:
    explicit EventContext(const Event &event);

    ViStatus getAttribute(ViAttr attribute, void *value) override;
    ViStatus setAttribute(ViAttr attribute, ViAttrState value) override;
    ViStatus close() override;

private:
    AttributeStore m_attributes;
};

} // namespace kyvisa
