#include "simulator/bus/BusAddressing.h"

#include "simulator/bus/InterfaceMessages.h"

#include <utility>

namespace simulator
{

bool BusAddressing::take(std::uint8_t message)
{
    const std::uint8_t group = message & bus::GroupMask;
    const std::uint8_t address = message & bus::AddressMask;
    if (group == bus::SecondaryGroup)
        return takeSecondary(address);
    m_listenPrimary = m_talkPrimary = false;
    switch (group) {
    case bus::ListenGroup:
        return takeListen(address);
    case bus::TalkGroup:
        takeTalk(address);
        return false;
    default:
        if (message == bus::SerialPollEnable || message == bus::SerialPollDisable)
            m_polled = message == bus::SerialPollEnable;
        return false;
    }
}

bool BusAddressing::takeListen(std::uint8_t address)
{
    if (address == bus::AddressMask)
        m_listening = false;
    if (address != m_address.primary)
        return false;
    if (m_address.secondary) {
        m_listenPrimary = true;
        return false;
    }
    m_talking = false;
    return m_listening = true;
}

void BusAddressing::takeTalk(std::uint8_t address)
{
    if (address != m_address.primary) {
        m_talking = false;
    } else if (m_address.secondary) {
        m_talkPrimary = true;
    } else {
        m_talking = true;
        m_listening = false;
    }
}

bool BusAddressing::takeSecondary(std::uint8_t address)
{
    const bool mine = m_address.secondary == address;
    if (m_talkPrimary) {
        m_talking = mine;
        m_listening = m_listening && !mine;
    }
    if (!m_listenPrimary || !mine)
        return false;
    m_talking = false;
    return m_listening = true;
}

void BusAddressing::interfaceClear()
{
    m_listening = m_talking = m_polled = m_listenPrimary = m_talkPrimary = false;
}

void BusAddressing::setAddress(BusAddress address)
{
    interfaceClear();
    m_address = address;
}

} // namespace simulator
