#pragma once

#include "simulator/instrument/Timers.h"

#include <array>
#include <cstdint>
#include <functional>
#include <random>
#include <vector>

namespace simulator
{

class Operations;
class StatusModel;

/// What a user sets on one output.
struct ChannelSettings {
    double voltage = 0;        ///< V
    double currentLimit = 0.1; ///< A
    bool output = false;

    bool operator==(const ChannelSettings &) const = default;
};

/// What a user sets for readings and triggers.
struct AcquisitionSettings {
    bool busTrigger = false;
    unsigned count = 1;
    double aperture = 0.001; ///< seconds a reading

    bool operator==(const AcquisitionSettings &) const = default;
};

/**
 * A two-channel voltage source that measures what it delivers. Each channel feeds a load resistor: the voltage is as set until the
 * current reaches its limit, from there on the limit rules. Readings carry noise of a seeded generator, so that two runs with the same seed agree.
 *
 * An acquisition of several readings takes its time and is an overlapped operation; the status registers follow all of it.
 */
class SourceMeasure
{
public:
    static constexpr std::size_t Channels = 2;
    static constexpr double MaxVoltage = 30;
    static constexpr double MaxCurrent = 3;
    static constexpr double MinCurrent = 0.001;
    static constexpr unsigned MaxCount = 10000;
    static constexpr double MinAperture = 0.0001;
    static constexpr double MaxAperture = 60;
    static constexpr double MinLoad = 0.01;
    static constexpr double MaxLoad = 1e9;
    static constexpr double DefaultLoad = 1000;

    /// Everything that *RST resets, and that *SAV keeps.
    struct Settings {
        std::array<ChannelSettings, Channels> channels;
        AcquisitionSettings acquisition;

        bool operator==(const Settings &) const = default;
    };

    SourceMeasure(Timers &timers, Operations &operations, StatusModel &status, std::uint64_t seed);

    const Settings &settings() const { return m_settings; }
    void apply(const Settings &settings);
    /// The resistor at a channel's terminals belongs to the bench, not to the settings.
    double load(std::size_t channel) const { return m_loads[channel]; }
    void setLoad(std::size_t channel, double ohms);

    double measureVoltage(std::size_t channel);
    double measureCurrent(std::size_t channel);

    /// Starts an acquisition of the first channel's voltage, or arms it for a trigger. Throws -213 when one is under way.
    void initiate();
    void trigger();
    void abort();
    bool acquiring() const { return m_state != State::Idle; }
    bool waitsForTrigger() const { return m_state == State::Armed; }
    /// Throws -230 when there are none.
    const std::vector<double> &readings() const;

private:
    enum class State : std::uint8_t { Idle, Armed, Measuring };
    struct Point {
        double voltage;
        double current;
        bool limited;
    };

    Point point(std::size_t channel) const;
    double noisy(double value, double floor);
    void setState(State state);
    void start();
    void updateQuestionable();

    Timers &m_timers;
    Operations &m_operations;
    StatusModel &m_status;
    Settings m_settings;
    std::array<double, Channels> m_loads;
    std::mt19937_64 m_generator;
    State m_state = State::Idle;
    Timers::Id m_timer = Timers::None;
    std::vector<double> m_readings;
};

} // namespace simulator
