#pragma once

#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace simulator
{

/// What is wrong with a header that a profile gives.
class HeaderPatternError : public std::runtime_error
{
public:
    using std::runtime_error::runtime_error;
};

/**
 * A command header as instrument manuals write it, "SOURce#:VOLTage[:LEVel]?": upper case is the short form, brackets enclose what may be left out,
 * `#` allows a numeric suffix, `?` makes it the query, `*` in front makes it a common command.
 */
struct HeaderPattern {
    std::vector<std::string> paths; ///< each way to write it, without brackets and without `?`
    bool query = false;
    bool suffix = false;

    /// Throws HeaderPatternError.
    explicit HeaderPattern(std::string_view text);
};

/// The first of @p others that a client could not tell from @p path: their mnemonics differ, but one is the other's long or short form, or only one takes a suffix.
/// Empty when there is none.
std::string ambiguity(std::string_view path, const std::vector<std::string> &others);

/// Long forms in upper case, without suffix marks: equal for two spellings of one header.
std::string longForm(std::string_view path);

} // namespace simulator
