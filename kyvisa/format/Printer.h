#pragma once

#include "kyvisa/format/Arguments.h"
#include "kyvisa/format/Directive.h"

#include <cstddef>
#include <span>
#include <string>
#include <string_view>

namespace kyvisa::format
{

/// Where formatted output goes. Each operation answers VI_SUCCESS or the failure that ends the output.
class OutputSink
{
public:
    virtual ViStatus append(std::span<const std::byte> data) = 0;
    /// A line feed with END.
    virtual ViStatus endLine() = 0;

protected:
    ~OutputSink() = default;
};

/**
 * Carries output directives out: takes the arguments in the order width, precision, array size, value, and appends the
 * text to a sink. The payload of a large block goes to the sink as it lies in the caller's memory where its bytes are in
 * the wire's order already.
 */
class Printer
{
public:
    Printer(Arguments &arguments, OutputSink &sink) : m_arguments(arguments), m_sink(sink) {}

    /// @return VI_SUCCESS, the sink's failure, or VI_ERROR_INV_FMT for a null or negative argument where none may be.
    ViStatus print(const Directives &directives);

    /// A directive's amounts, those from arguments included.
    struct Sizes {
        std::size_t width = 0;
        std::size_t precision = 0;
        bool precisionGiven = false;
        std::size_t count = 0; ///< of an array
        bool left = false;
    };

private:
    ViStatus convert(const Directive &directive);
    bool takeSizes(const Directive &directive, Sizes &sizes);
    bool takeCount(const Amount &amount, std::size_t &count);
    ViStatus printNumber(const Directive &directive, const Sizes &sizes);
    ViStatus printArray(const Directive &directive, const Sizes &sizes);
    ViStatus printString(const Sizes &sizes);
    ViStatus printBlock(const Directive &directive);
    ViStatus printElements(const Directive &directive, std::span<const std::byte> data);
    void storeCount(const Directive &directive);
    ViStatus appendPadded(std::string_view text, const Sizes &sizes);
    ViStatus append(std::string_view text);

    Arguments &m_arguments;
    OutputSink &m_sink;
    std::size_t m_written = 0;
};

} // namespace kyvisa::format
