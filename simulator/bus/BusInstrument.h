#pragma once

#include "simulator/bus/BusStation.h"
#include "simulator/server/Vxi11Device.h"

namespace simulator
{

/// An instrument on the bus, by a message exchange of its own.
class BusInstrument final : public BusStation
{
public:
    BusInstrument(BusAddress address, Instrument &instrument, Vxi11Device::Events events);

    LockTable &locks() override { return m_instrument.locks; }
    Vxi11Device *device() override { return &m_device; }
    void setRemoteEnable(bool enable) override { m_instrument.remote.setRemoteEnable(enable); }

    bool hasRoom() const override { return m_device.hasRoom(); }
    void write(std::span<const std::byte> bytes, bool end) override { m_device.write(bytes, end); }

    bool canTalk() const override { return true; }
    void readBegins() override { m_device.readBegins(); }
    bool answerReady() const override { return m_device.answerReady(); }
    Vxi11Response::Piece read(std::size_t most, std::optional<std::uint8_t> termination) override
    {
        return m_device.read(most, termination);
    }
    std::uint8_t poll() override { return m_device.poll(); }
    bool requestsService() const override { return m_device.requestsService(); }

private:
    void remote() override { m_instrument.remote.addressed(); }
    void goToLocal() override { m_instrument.remote.goToLocal(); }
    void lockOut() override { m_instrument.remote.setLockout(); }
    void clear() override { m_device.clear(); }
    void trigger() override { m_device.triggerInOrder(); }

    Instrument &m_instrument;
    Vxi11Device m_device;
};

} // namespace simulator
