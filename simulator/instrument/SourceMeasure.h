#pragma once

#include "simulator/instrument/Acquisition.h"

#include <array>
#include <cstdint>
#include <random>

namespace simulator
{

/// What a user sets on one output.
struct ChannelSettings {
    double voltage = 0;        ///< V
    double currentLimit = 0.1; ///< A
    bool protection = false;   ///< switch the output off when the current reaches its limit
    bool output = false;

    bool operator==(const ChannelSettings &) const = default;
};

/**
 * A two-channel voltage source that measures what it delivers. Each channel feeds a load resistor: the voltage is as set until the
 * current reaches its limit, from there on the limit rules, or with protection the output trips and stays off until that is cleared. Readings carry noise of a seeded
 * generator, so that two runs with the same seed agree. The status registers follow all of it.
 */
class SourceMeasure
{
public:
    static constexpr std::size_t Channels = 2;
    static constexpr double MaxVoltage = 30;
    static constexpr double MaxCurrent = 3;
    static constexpr double MinCurrent = 0.001;
    static constexpr double MinLoad = 0.01;
    static constexpr double MaxLoad = 1e9;
    static constexpr double DefaultLoad = 1000;

    using ChannelsSettings = std::array<ChannelSettings, Channels>;
    /// Everything that *RST resets, and that *SAV keeps.
    struct Settings {
        ChannelsSettings channels;
        AcquisitionSettings acquisition;

        bool operator==(const Settings &) const = default;
    };

    SourceMeasure(Timers &timers, Operations &operations, StatusModel &status, std::uint64_t seed);

    Settings settings() const { return {m_channels, acquisition.settings()}; }
    /// Ends an acquisition and clears trips.
    void apply(const Settings &settings);

    const ChannelSettings &channel(std::size_t channel) const { return m_channels[channel]; }
    /// Throws -221 when the output is to be switched on and has tripped.
    void setChannel(std::size_t channel, const ChannelSettings &settings);
    bool tripped(std::size_t channel) const { return m_tripped[channel]; }
    void clearTrip(std::size_t channel);
    /// The resistor at a channel's terminals belongs to the bench, not to the settings.
    double load(std::size_t channel) const { return m_loads[channel]; }
    void setLoad(std::size_t channel, double ohms);

    /// What is at a channel's terminals, in volts and amperes; a measurement adds its noise.
    struct Point {
        double voltage;
        double current;
        bool limited; ///< by the current limit
    };
    Point point(std::size_t channel) const;
    double measureVoltage(std::size_t channel);
    double measureCurrent(std::size_t channel);

    Acquisition acquisition; ///< of the first channel's voltage

private:
    double noisy(double value, double floor);
    void update();

    StatusModel &m_status;
    ChannelsSettings m_channels;
    std::array<bool, Channels> m_tripped{};
    std::array<double, Channels> m_loads;
    std::mt19937_64 m_generator;
};

} // namespace simulator
