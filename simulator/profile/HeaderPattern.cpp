#include "simulator/profile/HeaderPattern.h"

#include "simulator/instrument/Characters.h"

#include <algorithm>
#include <utility>

namespace simulator
{
namespace
{

constexpr std::size_t MaxMnemonic = 12;
constexpr std::size_t MaxNodes = 10;
constexpr std::size_t MaxOptional = 4;

bool isLower(char c)
{
    return isLetter(c) && !isUpper(c);
}

std::string upper(std::string_view text)
{
    std::string result{text};
    std::transform(result.begin(), result.end(), result.begin(), toUpper);
    return result;
}

/// One mnemonic and what it may be called.
struct Node {
    explicit Node(std::string_view mnemonic) : suffix(mnemonic.ends_with('#'))
    {
        if (suffix)
            mnemonic.remove_suffix(1);
        longForm = upper(mnemonic);
        shortForm = longForm.substr(
            0, static_cast<std::size_t>(std::find_if(mnemonic.begin(), mnemonic.end(), isLower) - mnemonic.begin()));
    }

    bool isSame(const Node &other) const { return longForm == other.longForm; }
    /// Not the same, but not to be told apart either.
    bool clashes(const Node &other) const
    {
        if (isSame(other))
            return shortForm != other.shortForm || suffix != other.suffix;
        return shortForm == other.shortForm || shortForm == other.longForm || longForm == other.shortForm;
    }

    std::string longForm;
    std::string shortForm;
    bool suffix;
};

/// Takes the first mnemonic of a path, and the colon behind it.
std::string_view takeNode(std::string_view &path)
{
    const std::size_t colon = std::min(path.find(':'), path.size());
    const std::string_view mnemonic = path.substr(0, colon);
    path.remove_prefix(std::min(colon + 1, path.size()));
    return mnemonic;
}

/// How many capital letters it begins with.
std::size_t capitals(std::string_view mnemonic)
{
    return static_cast<std::size_t>(std::find_if_not(mnemonic.begin(), mnemonic.end(), isUpper) - mnemonic.begin());
}

/// Whether clients could not tell these two paths apart. Called for each pair of a profile: nothing is allocated for most.
bool clash(std::string_view one, std::string_view other)
{
    while (!one.empty() && !other.empty()) {
        const std::string_view a = takeNode(one);
        const std::string_view b = takeNode(other);
        if (a == b)
            continue;
        // All forms of a mnemonic begin with the capital letters of its short form.
        const std::size_t common = std::min(capitals(a), capitals(b));
        if (a.substr(0, common) != b.substr(0, common))
            return false;
        const Node first(a);
        const Node second(b);
        if (first.clashes(second))
            return true;
        if (!first.isSame(second))
            return false;
    }
    return false;
}

/// Takes a mnemonic from the front.
std::string_view takeMnemonic(std::string_view &text)
{
    std::size_t size = 0;
    while (size < text.size() && isUpper(text[size]))
        ++size;
    const std::size_t shortSize = size;
    while (size < text.size() && isLower(text[size]))
        ++size;
    if (shortSize == 0)
        throw HeaderPatternError("a mnemonic begins with the capital letters of its short form");
    if (size > MaxMnemonic)
        throw HeaderPatternError("a mnemonic has at most " + std::to_string(MaxMnemonic) + " letters");
    if (size < text.size() && text[size] == '#')
        ++size;
    const std::string_view mnemonic = text.substr(0, size);
    text.remove_prefix(size);
    return mnemonic;
}

} // namespace

HeaderPattern::HeaderPattern(std::string_view text)
{
    if (text.ends_with('?')) {
        query = true;
        text.remove_suffix(1);
    }
    if (text.starts_with('*')) {
        text.remove_prefix(1);
        const std::string_view name = takeMnemonic(text);
        if (!text.empty() || name.ends_with('#') || std::any_of(name.begin(), name.end(), isLower))
            throw HeaderPatternError("a common command is an asterisk and capital letters");
        paths = {"*" + std::string{name}};
        return;
    }
    paths = {""};
    std::size_t nodes = 0;
    std::size_t optional = 0;
    bool behindColon = true; // what comes is a mnemonic, its colon has been there
    while (!text.empty()) {
        const bool bracket = text.starts_with('[');
        if (bracket)
            text.remove_prefix(1);
        if (text.starts_with(':') && !(nodes == 0 && bracket)) {
            if (behindColon)
                throw HeaderPatternError("a colon where a mnemonic should be");
            text.remove_prefix(1);
        } else if (!behindColon) {
            throw HeaderPatternError("\"" + std::string{text.substr(0, 1)} + "\" where a colon should be");
        }
        const std::string mnemonic{takeMnemonic(text)};
        if (mnemonic.ends_with('#') && std::exchange(suffix, true))
            throw HeaderPatternError("only one mnemonic can take a numeric suffix");
        behindColon = false;
        if (bracket) {
            if (text.starts_with(':')) {
                behindColon = true;
                text.remove_prefix(1);
            }
            if (!text.starts_with(']'))
                throw HeaderPatternError("a bracket encloses one mnemonic and its colon");
            text.remove_prefix(1);
        }
        if (++nodes > MaxNodes || (bracket && ++optional > MaxOptional))
            throw HeaderPatternError("the header has too many mnemonics");
        const std::size_t without = paths.size();
        for (std::size_t i = 0; i < without; ++i) {
            const std::string with = paths[i].empty() ? mnemonic : paths[i] + ":" + mnemonic;
            if (bracket)
                paths.push_back(with);
            else
                paths[i] = with;
        }
        if (text.starts_with(':') && text.size() == 1)
            throw HeaderPatternError("a colon at its end");
    }
    if (behindColon && nodes > 0)
        throw HeaderPatternError("a colon at its end");
    if (std::find(paths.begin(), paths.end(), "") != paths.end())
        throw HeaderPatternError("a header has a mnemonic that cannot be left out");
}

std::string ambiguity(std::string_view path, const std::vector<std::string> &others)
{
    const auto found =
        std::find_if(others.begin(), others.end(), [=](const std::string &other) { return clash(path, other); });
    return found == others.end() ? std::string{} : *found;
}

std::string longForm(std::string_view path)
{
    std::string result = upper(path);
    std::erase(result, '#');
    return result;
}

} // namespace simulator
