#pragma once

#include "simulator/bus/BusStation.h"
#include "simulator/instrument/LockTable.h"

namespace simulator
{

/// A station without a talker function, as plotters are: takes everything, answers nothing and cannot be polled.
class BusPlotter final : public BusStation
{
public:
    BusPlotter(BusAddress address, Timers &timers) : BusStation(address), m_locks(timers) {}

    LockTable &locks() override { return m_locks; }
    void setRemoteEnable(bool) override {}

    bool hasRoom() const override { return true; }
    void write(std::span<const std::byte>, bool) override {}

    bool canTalk() const override { return false; }
    void readBegins() override {}
    bool answerReady() const override { return false; }
    Vxi11Response::Piece read(std::size_t, std::optional<std::uint8_t>) override { return {}; }
    std::uint8_t poll() override { return 0; }
    bool requestsService() const override { return false; }

private:
    void remote() override {}
    void goToLocal() override {}
    void lockOut() override {}
    void clear() override {}
    void trigger() override {}

    LockTable m_locks;
};

} // namespace simulator
