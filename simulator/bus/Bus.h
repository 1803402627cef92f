#pragma once

#include "simulator/bus/BusAddressing.h"
#include "simulator/bus/BusStation.h"
#include "simulator/instrument/Timers.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <vector>

namespace simulator
{

/**
 * An IEEE 488.1 bus with its stations and the interface that controls it, which has an address of its own.
 *
 * The interface is system controller for good, and controller in charge until it passes control; it has it back after IFC. With ATN true it sends
 * commands; with ATN false data go from the one that talks to all that listen, at the speed of the slowest. Data that pass the interface by
 * do so on their own, from the timers.
 *
 *     bus.command({bus::Unlisten, bus::talk(21), bus::listen(5)});
 *     bus.write(bytes, true);
 */
class Bus
{
public:
    enum class Transfer : std::uint8_t {
        Done,
        Later,       ///< nobody to take it or to send it, or not now: try again when something has changed
        NotAddressed ///< the interface is not addressed to talk, or to listen
    };

    Bus(Timers &timers, std::uint8_t address) : m_timers(timers), m_own({address}) {}
    ~Bus();
    Bus(const Bus &) = delete;
    Bus &operator=(const Bus &) = delete;

    BusStation &add(std::unique_ptr<BusStation> station);
    const std::vector<std::unique_ptr<BusStation>> &stations() const { return m_stations; }

    // What the controller does. False: the interface is not in charge.
    [[nodiscard]] bool command(std::span<const std::uint8_t> messages);
    [[nodiscard]] bool setAttention(bool attention);
    [[nodiscard]] bool passControl(std::uint8_t address);
    // What the system controller does.
    void setRemoteEnable(bool enable);
    void interfaceClear();

    // What it sees.
    bool remoteEnable() const { return m_remoteEnable; }
    bool serviceRequested() const;
    /// NDAC: somebody is there for what comes next, a command or data.
    bool notDataAccepted() const;
    bool inCharge() const { return m_inCharge; }
    bool addressedToTalk() const { return m_own.talking(); }
    bool addressedToListen() const { return m_own.listening(); }
    std::uint8_t address() const { return m_own.address().primary; }
    void setAddress(std::uint8_t address) { m_own.setAddress({address}); }

    // Data of the interface. ATN is made false for it where the interface is in charge.
    Transfer write(std::span<const std::byte> bytes, bool end);
    void beginRead();
    Transfer read(std::size_t most, std::optional<std::uint8_t> termination, Vxi11Response::Piece &piece);
    /// All that listen have room: a trigger would not be lost.
    bool listenersHaveRoom() const;
    /// The station whose answer a read would fetch.
    BusStation *talker() const;

    /// A station has an answer or room: data may flow past the interface.
    void changed();

private:
    void standBy();
    void flow();
    bool somebodyListens() const;
    void tellListeners(std::span<const std::byte> bytes, bool end);

    Timers &m_timers;
    std::vector<std::unique_ptr<BusStation>> m_stations;
    BusAddressing m_own;
    bool m_inCharge = true;
    bool m_attention = false;
    bool m_remoteEnable = true;
    Timers::Id m_flow = Timers::None;
};

} // namespace simulator
