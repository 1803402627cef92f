#include "simulator/instrument/Acquisition.h"

#include "simulator/instrument/Operations.h"
#include "simulator/instrument/ScpiError.h"
#include "simulator/instrument/StatusBits.h"
#include "simulator/instrument/StatusModel.h"

#include <algorithm>
#include <utility>

namespace simulator
{
namespace
{

// A continuous acquisition without this would keep the processor busy for nothing.
constexpr double LeastContinuousPeriod = 0.01;

std::chrono::nanoseconds seconds(double value)
{
    return std::chrono::duration_cast<std::chrono::nanoseconds>(std::chrono::duration<double>{value});
}

} // namespace

Acquisition::Acquisition(Timers &timers, Operations &operations, StatusModel &status, std::function<double()> sample)
    : m_timers(timers), m_operations(operations), m_status(status), m_sample(std::move(sample))
{
}

void Acquisition::apply(const AcquisitionSettings &settings)
{
    toIdle();
    m_settings = settings;
    m_readings.clear();
    if (m_settings.continuous)
        begin();
}

void Acquisition::setContinuous(bool continuous)
{
    if (continuous)
        checkRoom();
    m_settings.continuous = continuous;
    if (continuous && !acquiring())
        begin();
}

void Acquisition::initiate()
{
    if (acquiring() || m_settings.continuous)
        throw ScpiError{-213, {}};
    checkRoom();
    m_readings.clear();
    m_pending = true;
    m_operations.begin();
    begin();
}

void Acquisition::checkRoom() const
{
    if (m_settings.triggers * m_settings.samples > MaxCount)
        throw ScpiError{-221, "too many readings"};
}

void Acquisition::begin()
{
    m_incoming.clear();
    m_triggersLeft = m_settings.triggers;
    arm();
}

void Acquisition::arm()
{
    if (m_settings.source == TriggerSource::Immediate)
        fire();
    else
        setState(State::Armed);
}

void Acquisition::busTrigger()
{
    if (m_state != State::Armed || m_settings.source != TriggerSource::Bus)
        throw ScpiError{-211, {}};
    fire();
}

void Acquisition::triggerNow()
{
    if (m_state != State::Armed)
        throw ScpiError{-211, {}};
    fire();
}

void Acquisition::fire()
{
    if (m_settings.delay <= 0)
        return measure();
    setState(State::Delaying);
    m_timer = m_timers.after(seconds(m_settings.delay), [this] { measure(); });
}

void Acquisition::measure()
{
    setState(State::Measuring);
    const double least = m_pending ? 0 : LeastContinuousPeriod;
    m_timer = m_timers.after(seconds(std::max(least, m_settings.aperture * m_settings.samples)), [this] {
        for (unsigned i = 0; i < m_settings.samples; ++i)
            m_incoming.push_back(m_sample());
        if (--m_triggersLeft > 0)
            arm();
        else
            finish();
    });
}

void Acquisition::finish()
{
    m_readings = std::exchange(m_incoming, {});
    toIdle();
    if (m_settings.continuous)
        begin();
}

void Acquisition::abort()
{
    toIdle();
    if (m_settings.continuous)
        begin();
}

void Acquisition::toIdle()
{
    m_timers.cancel(std::exchange(m_timer, Timers::None));
    setState(State::Idle);
    if (std::exchange(m_pending, false))
        m_operations.end();
}

bool Acquisition::needsTrigger() const
{
    return m_state == State::Armed ||
           (acquiring() && m_settings.source != TriggerSource::Immediate && m_triggersLeft > 1);
}

const std::vector<double> &Acquisition::readings() const
{
    if (m_readings.empty())
        throw ScpiError{-230, {}};
    return m_readings;
}

void Acquisition::setState(State state)
{
    m_state = state;
    unsigned condition = m_status.operation.condition() & ~(OperationMeasuring | OperationWaitingForTrigger);
    if (state == State::Armed)
        condition |= OperationWaitingForTrigger;
    else if (state == State::Measuring)
        condition |= OperationMeasuring;
    m_status.operation.setCondition(static_cast<std::uint16_t>(condition));
}

} // namespace simulator
