#pragma once

#include "simulator/instrument/Timers.h"

#include <cstdint>
#include <functional>
#include <vector>

namespace simulator
{

class Operations;
class StatusModel;

/// What lets an acquisition go on from its trigger layer. TRIGger:IMMediate does in any case.
enum class TriggerSource : std::uint8_t {
    Immediate,
    Bus, ///< *TRG, a group execute trigger, the trigger message of a protocol
    Hold,
};

/// What a user sets for readings and triggers.
struct AcquisitionSettings {
    TriggerSource source = TriggerSource::Immediate;
    double delay = 0;        ///< seconds from each trigger to its samples
    unsigned triggers = 1;   ///< an acquisition takes
    unsigned samples = 1;    ///< each trigger gives
    double aperture = 0.001; ///< seconds a sample
    bool continuous = false; ///< begin again at each end

    bool operator==(const AcquisitionSettings &) const = default;
};

/**
 * The trigger model, as SCPI-99 draws it with one layer:
 *
 *     idle --INITiate--> waiting for trigger --source--> delay --> samples --+--> idle
 *                           ^------------------ more triggers ---------------+
 *
 * From INITiate to idle it is an overlapped operation; *OPC, *OPC? and *WAI wait for it. A continuous acquisition is none, since it never ends. The
 * OPERation condition register shows where it stands. The readings of an acquisition are there when it has ended.
 */
class Acquisition
{
public:
    static constexpr unsigned MaxCount = 10000; ///< of triggers, of samples, and of readings in all
    static constexpr double MinAperture = 0.0001;
    static constexpr double MaxAperture = 60;
    static constexpr double MaxDelay = 3600;

    Acquisition(Timers &timers, Operations &operations, StatusModel &status, std::function<double()> sample);

    const AcquisitionSettings &settings() const { return m_settings; }
    /// Ends what is under way; readings that were taken with other settings are gone.
    void apply(const AcquisitionSettings &settings);
    /// May be changed while an acquisition is under way, which goes on to its end.
    void setContinuous(bool continuous);

    /// Throws -213 when one is under way, -221 when it would bring more readings than there is room for.
    void initiate();
    /// A trigger over the bus. Throws -211 when none is waited for.
    void busTrigger();
    /// A trigger whatever the source. Throws -211 when none is waited for.
    void triggerNow();
    void abort();

    bool acquiring() const { return m_state != State::Idle; }
    bool waitsForTrigger() const { return m_state == State::Armed; }
    /// True when the acquisition cannot end without a trigger from outside.
    bool needsTrigger() const;
    /// Of the last acquisition that ended. Throws -230 when there are none.
    const std::vector<double> &readings() const;

private:
    enum class State : std::uint8_t { Idle, Armed, Delaying, Measuring };

    void checkRoom() const;
    void begin();
    void arm();
    void fire();
    void measure();
    void finish();
    void toIdle();
    void setState(State state);

    Timers &m_timers;
    Operations &m_operations;
    StatusModel &m_status;
    const std::function<double()> m_sample;
    AcquisitionSettings m_settings;
    State m_state = State::Idle;
    bool m_pending = false; ///< it counts as an operation
    unsigned m_triggersLeft = 0;
    Timers::Id m_timer = Timers::None;
    std::vector<double> m_incoming;
    std::vector<double> m_readings;
};

} // namespace simulator
