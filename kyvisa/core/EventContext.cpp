#include "kyvisa/core/EventContext.h"

#include "kyvisa/core/Event.h"
#include "kyvisa/include/visa.h"

namespace kyvisa
{
namespace
{

std::uint16_t kindOf(ViEventType type)
{
    switch (type) {
    case VI_EVENT_IO_COMPLETION:
        return kind::CompletionEvent;
    case VI_EVENT_EXCEPTION:
        return kind::ExceptionEvent;
    default:
        return kind::OtherEvent;
    }
}

} // namespace

EventContext::EventContext(const Event &event) : m_attributes(kindOf(event.type))
{
    m_attributes.setNumber(VI_ATTR_EVENT_TYPE, event.type);
    m_attributes.setNumber(VI_ATTR_STATUS, static_cast<ViUInt32>(event.status));
    m_attributes.setNumber(VI_ATTR_JOB_ID, event.job);
    m_attributes.setNumber(VI_ATTR_RET_COUNT_32, event.count);
    m_attributes.setNumber(VI_ATTR_RET_COUNT_64, event.count);
    m_attributes.setNumber(VI_ATTR_BUFFER, reinterpret_cast<std::uintptr_t>(event.buffer));
    m_attributes.setText(VI_ATTR_OPER_NAME, event.operation);
}

ViStatus EventContext::getAttribute(ViAttr attribute, void *value)
{
    return m_attributes.get(attribute, value);
}

ViStatus EventContext::setAttribute(ViAttr attribute, ViAttrState value)
{
    const AttributeRow *row;
    std::int64_t number;
    return m_attributes.check(attribute, value, row, number);
}

ViStatus EventContext::close()
{
    return VI_SUCCESS;
}

} // namespace kyvisa
