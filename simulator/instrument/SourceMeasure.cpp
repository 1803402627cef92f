#include "simulator/instrument/SourceMeasure.h"

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

constexpr double RelativeNoise = 20e-6;
constexpr double VoltageFloor = 50e-6;
constexpr double CurrentFloor = 200e-9;

} // namespace

SourceMeasure::SourceMeasure(Timers &timers, Operations &operations, StatusModel &status, std::uint64_t seed)
    : m_timers(timers), m_operations(operations), m_status(status), m_generator(seed)
{
    m_loads.fill(DefaultLoad);
}

void SourceMeasure::apply(const Settings &settings)
{
    m_settings = settings;
    updateQuestionable();
}

void SourceMeasure::setLoad(std::size_t channel, double ohms)
{
    m_loads[channel] = ohms;
    updateQuestionable();
}

SourceMeasure::Point SourceMeasure::point(std::size_t channel) const
{
    const ChannelSettings &settings = m_settings.channels[channel];
    if (!settings.output)
        return {0, 0, false};
    const double current = settings.voltage / m_loads[channel];
    if (current <= settings.currentLimit)
        return {settings.voltage, current, false};
    return {settings.currentLimit * m_loads[channel], settings.currentLimit, true};
}

double SourceMeasure::noisy(double value, double floor)
{
    std::normal_distribution<double> noise(0, floor + RelativeNoise * value);
    return value + noise(m_generator);
}

double SourceMeasure::measureVoltage(std::size_t channel)
{
    return noisy(point(channel).voltage, VoltageFloor);
}

double SourceMeasure::measureCurrent(std::size_t channel)
{
    return noisy(point(channel).current, CurrentFloor);
}

void SourceMeasure::initiate()
{
    if (acquiring())
        throw ScpiError{-213, {}};
    m_readings.clear();
    m_operations.begin();
    if (m_settings.acquisition.busTrigger)
        setState(State::Armed);
    else
        start();
}

void SourceMeasure::trigger()
{
    if (m_state != State::Armed)
        throw ScpiError{-211, {}};
    start();
}

void SourceMeasure::start()
{
    setState(State::Measuring);
    const AcquisitionSettings &acquisition = m_settings.acquisition;
    const std::chrono::duration<double> duration{acquisition.aperture * acquisition.count};
    m_timer = m_timers.after(std::chrono::duration_cast<std::chrono::nanoseconds>(duration),
                             [this, count = acquisition.count] {
                                 for (unsigned i = 0; i < count; ++i)
                                     m_readings.push_back(measureVoltage(0));
                                 setState(State::Idle);
                                 m_operations.end();
                             });
}

void SourceMeasure::abort()
{
    if (!acquiring())
        return;
    m_timers.cancel(m_timer);
    setState(State::Idle);
    m_operations.end();
}

const std::vector<double> &SourceMeasure::readings() const
{
    if (m_readings.empty())
        throw ScpiError{-230, {}};
    return m_readings;
}

void SourceMeasure::setState(State state)
{
    m_state = state;
    unsigned condition = m_status.operation.condition() & ~(OperationMeasuring | OperationWaitingForTrigger);
    if (state == State::Armed)
        condition |= OperationWaitingForTrigger;
    else if (state == State::Measuring)
        condition |= OperationMeasuring;
    m_status.operation.setCondition(static_cast<std::uint16_t>(condition));
}

void SourceMeasure::updateQuestionable()
{
    bool limited = false;
    for (std::size_t channel = 0; channel < Channels; ++channel)
        limited = limited || point(channel).limited;
    const unsigned others = m_status.questionable.condition() & ~QuestionableVoltage;
    m_status.questionable.setCondition(
        static_cast<std::uint16_t>(others | (limited ? unsigned{QuestionableVoltage} : 0u)));
}

} // namespace simulator
