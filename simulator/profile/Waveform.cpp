#include "simulator/profile/Waveform.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <limits>
#include <numbers>

namespace simulator
{
namespace
{

/// Between -1 and 1; @p phase counts periods.
double shapeAt(WaveformShape shape, double phase)
{
    const double part = phase - std::floor(phase);
    switch (shape) {
    case WaveformShape::Sine:
        return std::sin(2 * std::numbers::pi * part);
    case WaveformShape::Square:
        return part < 0.5 ? 1 : -1;
    case WaveformShape::Triangle:
        return part < 0.25 ? 4 * part : part < 0.75 ? 2 - 4 * part : 4 * part - 4;
    case WaveformShape::Ramp:
        return 2 * part - 1;
    case WaveformShape::Flat:
        return 0;
    }
    return 0;
}

/// What a float cannot hold is infinite there.
float narrowed(double value)
{
    constexpr double Most = std::numeric_limits<float>::max();
    if (std::fabs(value) > Most)
        return std::copysign(std::numeric_limits<float>::infinity(), static_cast<float>(value > 0 ? 1 : -1));
    return static_cast<float>(value);
}

class Writer
{
public:
    Writer(SampleFormat format, bool bigEndian) : m_format(format), m_bigEndian(bigEndian) {}

    void reserve(std::size_t samples) { m_bytes.reserve(samples * sizeof(double)); }
    std::vector<std::byte> take() { return std::move(m_bytes); }

    bool isInteger() const { return m_format != SampleFormat::Float32 && m_format != SampleFormat::Float64; }

    void write(double value)
    {
        switch (m_format) {
        case SampleFormat::Int8:
            return integer<std::int8_t>(value);
        case SampleFormat::Uint8:
            return integer<std::uint8_t>(value);
        case SampleFormat::Int16:
            return integer<std::int16_t>(value);
        case SampleFormat::Uint16:
            return integer<std::uint16_t>(value);
        case SampleFormat::Int32:
            return integer<std::int32_t>(value);
        case SampleFormat::Float32:
            return bytes(std::bit_cast<std::uint32_t>(narrowed(value)), 4);
        case SampleFormat::Float64:
            return bytes(std::bit_cast<std::uint64_t>(value), 8);
        }
    }

private:
    template <typename Integer>
    void integer(double value)
    {
        constexpr double Least = std::numeric_limits<Integer>::min();
        constexpr double Most = std::numeric_limits<Integer>::max();
        const double held = std::isnan(value) ? 0 : std::clamp(std::round(value), Least, Most);
        bytes(static_cast<std::uint64_t>(static_cast<std::int64_t>(held)), sizeof(Integer));
    }

    void bytes(std::uint64_t value, unsigned size)
    {
        for (unsigned i = 0; i < size; ++i) {
            const unsigned shift = 8 * (m_bigEndian ? size - 1 - i : i);
            m_bytes.push_back(static_cast<std::byte>(value >> shift & 0xFF));
        }
    }

    const SampleFormat m_format;
    const bool m_bigEndian;
    std::vector<std::byte> m_bytes;
};

template <typename Value>
Value chosen(const std::vector<Value> &values, const std::optional<std::size_t> &setting,
             const Expression::Surroundings &surroundings)
{
    const std::size_t index = setting ? static_cast<std::size_t>(surroundings.setting(*setting)) : 0;
    return values.at(std::min(index, values.size() - 1));
}

} // namespace

std::vector<std::byte> samplesOf(const Waveform &waveform, const Expression::Surroundings &surroundings)
{
    const double asked = waveform.points.value(surroundings);
    const auto points = static_cast<std::size_t>(
        std::isnan(asked) ? 0 : std::clamp(asked, 0.0, static_cast<double>(Waveform::MaxPoints)));
    const WaveformShape shape = chosen(waveform.shapes, waveform.shapeSetting, surroundings);
    const double amplitude = waveform.amplitude.value(surroundings);
    const double offset = waveform.offset.value(surroundings);
    const double periods = waveform.periods.value(surroundings);
    const double noise = waveform.noise.value(surroundings);
    const double scale = waveform.scale.value(surroundings);

    Writer writer(chosen(waveform.formats, waveform.formatSetting, surroundings), waveform.bigEndian);
    writer.reserve(points);
    for (std::size_t i = 0; i < points; ++i) {
        const double phase = periods * static_cast<double>(i) / static_cast<double>(points);
        double value = offset + amplitude * shapeAt(shape, phase);
        if (noise != 0)
            value += noise * surroundings.normal();
        writer.write(writer.isInteger() ? value / scale : value);
    }
    return writer.take();
}

} // namespace simulator
