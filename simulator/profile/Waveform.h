#pragma once

#include "simulator/profile/Expression.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

namespace simulator
{

enum class WaveformShape : std::uint8_t { Sine, Square, Triangle, Ramp, Flat };
enum class SampleFormat : std::uint8_t { Int8, Uint8, Int16, Uint16, Int32, Float32, Float64 };

/// A binary block of samples, computed from settings each time it is asked for.
struct Waveform {
    static constexpr std::size_t MaxPoints = 1'000'000;

    std::vector<WaveformShape> shapes; ///< one, or those that the shape setting's values stand for
    std::optional<std::size_t> shapeSetting;
    std::vector<SampleFormat> formats; ///< likewise
    std::optional<std::size_t> formatSetting;
    Expression points;
    Expression amplitude; ///< above and below the offset
    Expression offset;
    Expression periods;
    Expression noise; ///< standard deviation
    Expression scale; ///< what one code of an integer format stands for
    bool bigEndian = true;
};

/// The samples of a waveform in its format. What an integer format cannot hold stands at its limit.
std::vector<std::byte> samplesOf(const Waveform &waveform, const Expression::Surroundings &surroundings);

} // namespace simulator
