#include "simulator/server/HislipDelivery.h"

namespace simulator
{

using namespace wire::hislip;

void HislipDelivery::restart(bool overlapped)
{
    m_overlapped = overlapped;
    m_lastId = NothingSentId;
    m_unread = 0;
}

std::uint32_t HislipDelivery::nextId(std::uint32_t request)
{
    return m_overlapped ? m_lastId += 2 : request;
}

bool HislipDelivery::messageCame(bool delivered)
{
    if (m_overlapped) {
        if (delivered)
            read();
        return true;
    }
    const bool expected = m_unread > 0;
    m_unread = 0;
    return expected == delivered;
}

void HislipDelivery::statusQueryCame(bool delivered, std::uint32_t id)
{
    if (!m_overlapped) {
        if (delivered)
            m_unread = 0;
    } else if (id == m_lastId) {
        m_unread = 0;
    } else if (delivered) {
        read();
    }
}

void HislipDelivery::read()
{
    if (m_unread == 1)
        m_unread = 0;
}

} // namespace simulator
