#pragma once

#include <cstdint>

namespace simulator
{

/// One group of SCPI-99 status registers: condition, transition filters, event, enable. Bit 15 is always 0.
class RegisterGroup
{
public:
    static constexpr std::uint16_t Mask = 0x7FFF;

    void setCondition(std::uint16_t condition);
    std::uint16_t condition() const { return m_condition; }
    /// Reading clears.
    std::uint16_t takeEvent();
    std::uint16_t event() const { return m_event; }
    void clearEvent() { m_event = 0; }
    void preset();
    bool summary() const { return (m_event & enable) != 0; }

    std::uint16_t enable = 0;
    std::uint16_t positive = Mask; ///< PTRansition: bits whose rise is an event
    std::uint16_t negative = 0;    ///< NTRansition: bits whose fall is an event

private:
    std::uint16_t m_condition = 0;
    std::uint16_t m_event = 0;
};

/// The status registers that all clients share. What differs from client to client (MAV, RQS) is in ServiceRequest.
class StatusModel
{
public:
    StatusModel();

    void setEvent(std::uint8_t bits) { m_esr |= bits; }
    std::uint8_t takeEvent();
    std::uint8_t event() const { return m_esr; }
    std::uint8_t eventEnable() const { return m_ese; }
    void setEventEnable(std::uint8_t mask) { m_ese = mask; }
    std::uint8_t serviceEnable() const { return m_sre; }
    void setServiceEnable(std::uint8_t mask);
    /// The power comes: tells so, and clears the enables and filters if @p clear (*PSC).
    void powerOn(bool clear);
    /// *CLS: all event registers, none of the enables and filters.
    void clearEvents();

    /// The shared bits of the status byte.
    std::uint8_t summary(bool errorAvailable) const;

    RegisterGroup operation;
    RegisterGroup questionable;

private:
    std::uint8_t m_esr;
    std::uint8_t m_ese = 0;
    std::uint8_t m_sre = 0;
};

/**
 * RQS of one client. A service request needs a new reason: an enabled bit of the status byte that was 0 and is 1. A serial poll answers
 * and withdraws the request; so does the end of all reasons.
 */
class ServiceRequest
{
public:
    /// Tells the state of the byte. True when this makes the client's request line rise.
    bool update(std::uint8_t statusByte, std::uint8_t serviceEnable);
    /// The status byte with RQS as bit 6, which is 0 afterwards.
    std::uint8_t poll(std::uint8_t statusByte);
    bool requesting() const { return m_requesting; }

private:
    std::uint8_t m_reasons = 0;
    bool m_requesting = false;
};

} // namespace simulator
