#pragma once

#include "simulator/instrument/ScpiError.h"
#include "simulator/profile/Expression.h"
#include "simulator/profile/Waveform.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <variant>
#include <vector>

namespace simulator
{

/// How a number is written in an answer.
struct NumberStyle {
    enum class Form : std::uint8_t { Nr1, Nr2, Nr3 };

    Form form = Form::Nr3;
    unsigned digits = 7; ///< significant ones of Nr3, behind the point of Nr2
};

/// Something that sticks: set by a command, told by its query, reset by *RST, kept by *SAV.
struct ProfileSetting {
    enum class Type : std::uint8_t { Number, Integer, Boolean, Choice };

    std::string name; ///< in expressions
    std::string header;
    Type type = Type::Number;
    std::string unit;
    double least = 0;
    double most = 0;
    double initial = 0;
    std::vector<std::string> choices; ///< written like "IMMediate"
    unsigned channels = 1;            ///< more than one only with a numeric suffix in the header
    double pending = 0;               ///< seconds that a change takes, as an overlapped operation
    NumberStyle style;
    std::size_t firstValue = 0; ///< index of the first channel's value among those of all settings
};

struct FixedAnswer {
    std::string text;
};
/// One after the other, then from the start again.
struct ListAnswer {
    std::vector<std::string> texts;
};
struct CounterAnswer {
    double start = 0;
    double step = 1;
};
struct RandomAnswer {
    double least = 0;
    double most = 1;
    NumberStyle style;
};
struct ComputedAnswer {
    Expression expression;
    NumberStyle style;
};
using ProfileAnswer = std::variant<FixedAnswer, ListAnswer, CounterAnswer, RandomAnswer, ComputedAnswer, Waveform>;

struct ProfileCommand {
    std::string header; ///< with `?` for a query
    std::size_t leastParameters = 0;
    std::size_t mostParameters = 0;
    unsigned channels = 1;
    std::optional<ProfileAnswer> answer; ///< a query has one, or an error
    double delay = 0;                    ///< seconds before the answer, while its client waits
    double pending = 0;                  ///< seconds of an overlapped operation that it starts
    std::optional<ScpiError> error;
};

/// An instrument as a file describes it.
struct Profile {
    std::optional<std::string> manufacturer;
    std::optional<std::string> model;
    std::optional<std::string> serial;
    std::optional<std::string> firmware;
    std::optional<std::size_t> maxMessage;
    std::optional<std::size_t> errorQueue;
    bool sourceMeasure = true; ///< keep the built-in source and measure commands
    std::vector<ProfileSetting> settings;
    std::vector<ProfileCommand> commands;
};

} // namespace simulator
