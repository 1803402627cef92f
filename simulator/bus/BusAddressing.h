#pragma once

#include "simulator/bus/BusAddress.h"

namespace simulator
{

/**
 * The listener and the talker function of IEEE 488.1, extended ones where there is a secondary address: who is addressed follows from the commands
 * that pass by.
 *
 * Being told to talk ends being told to listen, and the other way round. A secondary address counts directly behind the primary one, so that what
 * follows a parallel poll configuration is none.
 */
class BusAddressing
{
public:
    explicit BusAddressing(BusAddress address) : m_address(address) {}

    /// A byte that came with ATN. True when it addresses this station to listen, again or for the first time.
    bool take(std::uint8_t message);
    void interfaceClear();

    const BusAddress &address() const { return m_address; }
    /// Forgets what it was addressed to do.
    void setAddress(BusAddress address);

    bool listening() const { return m_listening; }
    bool talking() const { return m_talking; }
    /// Between SPE and SPD: whoever talks sends its status byte.
    bool polled() const { return m_polled; }

private:
    bool takeListen(std::uint8_t address);
    void takeTalk(std::uint8_t address);
    bool takeSecondary(std::uint8_t address);

    BusAddress m_address;
    bool m_listening = false;
    bool m_talking = false;
    bool m_polled = false;
    bool m_listenPrimary = false; ///< the secondary address that completes it may follow
    bool m_talkPrimary = false;
};

} // namespace simulator
