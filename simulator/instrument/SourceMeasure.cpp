#include "simulator/instrument/SourceMeasure.h"

#include "simulator/instrument/ScpiError.h"
#include "simulator/instrument/StatusBits.h"
#include "simulator/instrument/StatusModel.h"

namespace simulator
{
namespace
{

constexpr double RelativeNoise = 20e-6;
constexpr double VoltageFloor = 50e-6;
constexpr double CurrentFloor = 200e-9;

} // namespace

SourceMeasure::SourceMeasure(Timers &timers, Operations &operations, StatusModel &status, std::uint64_t seed)
    : acquisition(timers, operations, status, [this] { return measureVoltage(0); }), m_status(status), m_generator(seed)
{
    m_loads.fill(DefaultLoad);
}

void SourceMeasure::apply(const Settings &settings)
{
    m_tripped.fill(false);
    m_channels = settings.channels;
    update();
    acquisition.apply(settings.acquisition);
}

void SourceMeasure::setChannel(std::size_t channel, const ChannelSettings &settings)
{
    if (settings.output && m_tripped[channel])
        throw ScpiError{-221, "protection has tripped"};
    m_channels[channel] = settings;
    update();
}

void SourceMeasure::clearTrip(std::size_t channel)
{
    m_tripped[channel] = false;
    update();
}

void SourceMeasure::setLoad(std::size_t channel, double ohms)
{
    m_loads[channel] = ohms;
    update();
}

SourceMeasure::Point SourceMeasure::point(std::size_t channel) const
{
    const ChannelSettings &settings = m_channels[channel];
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

/// Trips what has to, and tells the status registers.
void SourceMeasure::update()
{
    unsigned condition = m_status.questionable.condition() & ~(QuestionableVoltage | QuestionableCurrent);
    for (std::size_t channel = 0; channel < Channels; ++channel) {
        if (point(channel).limited && m_channels[channel].protection) {
            m_tripped[channel] = true;
            m_channels[channel].output = false;
        }
        if (point(channel).limited)
            condition |= QuestionableVoltage;
        if (m_tripped[channel])
            condition |= QuestionableCurrent;
    }
    m_status.questionable.setCondition(static_cast<std::uint16_t>(condition));
}

} // namespace simulator
