#pragma once

#include "kyvisa/format/Arguments.h"
#include "kyvisa/format/Directive.h"
#include "kyvisa/format/NumberText.h"

#include <cstddef>
#include <span>
#include <string_view>

namespace kyvisa::format
{

/// Where formatted input comes from: the bytes of one message, fetched as they are wanted.
class InputSource
{
public:
    static constexpr int Nothing = -1;

    /// The byte @p ahead of the next one, or Nothing behind the message's last byte, or when fetching failed.
    virtual int peek(std::size_t ahead = 0) = 0;
    /// Passes over one byte that peek() has shown.
    virtual void skip() = 0;
    /// Takes bytes until @p data is full or the message ends. @return how many.
    virtual std::size_t take(std::span<std::byte> data) = 0;
    /// VI_SUCCESS, or why fetching failed.
    virtual ViStatus status() const = 0;

protected:
    ~InputSource() = default;
};

/**
 * Carries input directives out, as C's scanf does: what matches is taken and stored, the first byte that does not match
 * stays for the next call and ends this one. The end of the message ends it as well. Both are VI_SUCCESS.
 */
class Scanner
{
public:
    Scanner(Arguments &arguments, InputSource &source) : m_arguments(arguments), m_source(source) {}

    /// @return VI_SUCCESS, the source's failure, or VI_ERROR_INV_FMT for a null or negative argument where none may be.
    ViStatus scan(const Directives &directives);

private:
    enum class Step { Matched, Ended, Wrong };

    /// The size behind a width, and where the number of items goes in the end.
    struct Size {
        bool given = false;
        std::size_t value = 0;
        void *countTo = nullptr;
        bool isLong = false;

        void store(std::size_t count) const;
    };

    Step carryOut(const Directive &directive);
    Step matchText(std::string_view text);
    bool takeSize(const Amount &amount, bool isLong, Size &size);

    Step scanNumbers(const Directive &directive);
    bool readNumber(const Directive &directive, std::size_t limit, Number &number);
    bool readPrefixed(std::size_t limit, Number &number);
    bool readDigits(int base, std::size_t limit, Number &number);
    bool readDecimal(std::size_t limit, Number &number);
    void store(const Directive &directive, const Number &number, void *array, std::size_t index);

    Step scanCharacters(const Directive &directive);
    Step scanText(const Directive &directive);
    Step scanBlock(const Directive &directive);
    Step takeElements(const Directive &directive, const Size &size, std::size_t length, bool isBlock);
    std::size_t dropUpTo(std::size_t count);
    void storeCount(const Directive &directive);

    void skipBlanks();
    int next();

    Arguments &m_arguments;
    InputSource &m_source;
    std::size_t m_taken = 0;
};

} // namespace kyvisa::format
