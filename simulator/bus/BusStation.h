#pragma once

#include "simulator/bus/BusAddressing.h"
#include "simulator/server/Vxi11Response.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>

namespace simulator
{

class LockTable;
class Vxi11Device;

/**
 * Something at an address of the bus. It hears every command, and does what it is told by those that are for it.
 *
 * Data come by write() while it is addressed to listen and has room, and are fetched by read() while it is addressed to talk.
 */
class BusStation
{
public:
    explicit BusStation(BusAddress address) : m_addressing(address) {}
    virtual ~BusStation() = default;

    /// A byte that came with ATN, while REN was as given.
    void take(std::uint8_t message, bool remoteEnable);
    void interfaceClear() { m_addressing.interfaceClear(); }

    const BusAddress &address() const { return m_addressing.address(); }
    bool listening() const { return m_addressing.listening(); }
    bool talking() const { return canTalk() && m_addressing.talking(); }
    bool polled() const { return m_addressing.polled(); }

    virtual LockTable &locks() = 0;
    /// Where it exchanges messages; none where it does not.
    virtual Vxi11Device *device() { return nullptr; }
    virtual void setRemoteEnable(bool enable) = 0;

    virtual bool hasRoom() const = 0;
    virtual void write(std::span<const std::byte> bytes, bool end) = 0;

    virtual bool canTalk() const = 0;
    /// It is asked for an answer, once for each.
    virtual void readBegins() = 0;
    virtual bool answerReady() const = 0;
    virtual Vxi11Response::Piece read(std::size_t most, std::optional<std::uint8_t> termination) = 0;
    /// Its status byte; the request for service is answered by that.
    virtual std::uint8_t poll() = 0;
    virtual bool requestsService() const = 0;

protected:
    virtual void remote() = 0; ///< addressed to listen while REN is true
    virtual void goToLocal() = 0;
    virtual void lockOut() = 0;
    virtual void clear() = 0;
    virtual void trigger() = 0;

private:
    BusAddressing m_addressing;
};

} // namespace simulator
