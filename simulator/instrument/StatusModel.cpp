#include "simulator/instrument/StatusModel.h"

#include "simulator/instrument/StatusBits.h"

#include <utility>

namespace simulator
{

void RegisterGroup::setCondition(std::uint16_t condition)
{
    condition &= Mask;
    const auto rise = static_cast<std::uint16_t>(condition & ~m_condition);
    const auto fall = static_cast<std::uint16_t>(m_condition & ~condition);
    m_event = static_cast<std::uint16_t>(m_event | (rise & positive) | (fall & negative));
    m_condition = condition;
}

std::uint16_t RegisterGroup::takeEvent()
{
    return std::exchange(m_event, std::uint16_t{0});
}

void RegisterGroup::preset()
{
    enable = 0;
    positive = Mask;
    negative = 0;
}

StatusModel::StatusModel() : m_esr(EsrPowerOn) {}

std::uint8_t StatusModel::takeEvent()
{
    return std::exchange(m_esr, std::uint8_t{0});
}

void StatusModel::setServiceEnable(std::uint8_t mask)
{
    m_sre = static_cast<std::uint8_t>(mask & ~StbRequestService);
}

void StatusModel::powerOn(bool clear)
{
    m_esr = EsrPowerOn;
    if (!clear)
        return;
    m_ese = m_sre = 0;
    operation.preset();
    questionable.preset();
}

void StatusModel::clearEvents()
{
    m_esr = 0;
    operation.clearEvent();
    questionable.clearEvent();
}

std::uint8_t StatusModel::summary(bool errorAvailable) const
{
    unsigned summary = 0;
    if (errorAvailable)
        summary |= StbErrorAvailable;
    if (questionable.summary())
        summary |= StbQuestionable;
    if ((m_esr & m_ese) != 0)
        summary |= StbStandardEvent;
    if (operation.summary())
        summary |= StbOperation;
    return static_cast<std::uint8_t>(summary);
}

bool ServiceRequest::update(std::uint8_t statusByte, std::uint8_t serviceEnable)
{
    const auto reasons = static_cast<std::uint8_t>(statusByte & serviceEnable & ~StbRequestService);
    const bool isNew = (reasons & ~m_reasons) != 0;
    m_reasons = reasons;
    if (reasons == 0) {
        m_requesting = false;
        return false;
    }
    return isNew && !std::exchange(m_requesting, true);
}

std::uint8_t ServiceRequest::poll(std::uint8_t statusByte)
{
    const unsigned request = std::exchange(m_requesting, false) ? StbRequestService : 0;
    return static_cast<std::uint8_t>((statusByte & ~StbRequestService) | request);
}

} // namespace simulator
