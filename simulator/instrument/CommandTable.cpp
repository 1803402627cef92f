#include "simulator/instrument/CommandTable.h"

#include "simulator/instrument/Characters.h"
#include "simulator/instrument/Parser.h"
#include "simulator/instrument/ScpiError.h"

#include <algorithm>

namespace simulator
{

struct CommandTable::Node {
    std::string longForm; ///< upper case
    std::size_t shortLength = 0;
    bool takesSuffix = false;
    std::vector<std::unique_ptr<Node>> children;
    std::shared_ptr<const Entry> set;
    std::shared_ptr<const Entry> query;

    Node &child(std::string_view mnemonic);
};

namespace
{

constexpr unsigned MaxSuffix = 999999;

bool equalIgnoringCase(std::string_view sent, std::string_view upperCase)
{
    return std::equal(sent.begin(), sent.end(), upperCase.begin(), upperCase.end(),
                      [](char a, char b) { return toUpper(a) == b; });
}

/// True when @p sent names the node; then @p suffix is the number behind it.
bool names(const CommandTable::Node &node, std::string_view sent, unsigned &suffix)
{
    suffix = 1;
    std::string_view word = sent;
    if (node.takesSuffix) {
        while (!word.empty() && isDigit(word.back()))
            word.remove_suffix(1);
        if (word.size() < sent.size()) {
            suffix = 0;
            for (const char c : sent.substr(word.size()))
                suffix = std::min(suffix * 10 + static_cast<unsigned>(c - '0'), MaxSuffix);
        }
    }
    const std::string_view whole{node.longForm};
    return equalIgnoringCase(word, whole) || equalIgnoringCase(word, whole.substr(0, node.shortLength));
}

/// True when only the numeric suffix is in the way: the mnemonic takes none.
bool isOtherwiseKnown(const CommandTable::Node &parent, std::string_view sent)
{
    const std::size_t letters = sent.find_last_not_of("0123456789") + 1;
    unsigned suffix = 1;
    return letters < sent.size() && std::any_of(parent.children.begin(), parent.children.end(), [&](const auto &child) {
               return names(*child, sent.substr(0, letters), suffix);
           });
}

} // namespace

/// The child that the pattern's mnemonic names, made when it is new.
CommandTable::Node &CommandTable::Node::child(std::string_view mnemonic)
{
    const bool suffix = mnemonic.back() == '#';
    if (suffix)
        mnemonic.remove_suffix(1);
    std::string upperCase{mnemonic};
    std::transform(upperCase.begin(), upperCase.end(), upperCase.begin(), toUpper);
    for (const auto &node : children)
        if (node->longForm == upperCase)
            return *node;
    auto node = std::make_unique<Node>();
    node->longForm = upperCase;
    node->shortLength =
        static_cast<std::size_t>(std::find_if_not(mnemonic.begin(), mnemonic.end(), isUpper) - mnemonic.begin());
    node->takesSuffix = suffix;
    children.push_back(std::move(node));
    return *children.back();
}

CommandTable::CommandTable() : m_root(std::make_unique<Node>()), m_common(std::make_unique<Node>()) {}

CommandTable::~CommandTable() = default;

void CommandTable::add(std::string_view pattern, Arity arity, Handler handler)
{
    const bool query = pattern.back() == '?';
    if (query)
        pattern.remove_suffix(1);
    const auto entry = std::make_shared<const Entry>(Entry{arity, std::move(handler)});
    if (pattern.front() == '*')
        addBelow(*m_common, pattern.substr(1), query, entry);
    else
        addBelow(*m_root, pattern, query, entry);
}

void CommandTable::addBelow(Node &node, std::string_view rest, bool query, const std::shared_ptr<const Entry> &entry)
{
    if (!rest.empty() && rest.front() == ':')
        rest.remove_prefix(1);
    if (rest.empty()) {
        (query ? node.query : node.set) = entry;
        return;
    }
    if (rest.front() == '[') {
        const std::size_t end = rest.find(']');
        const std::string_view inside = rest.substr(1, end - 1);
        const std::string_view behind = rest.substr(end + 1);
        addBelow(node, behind, query, entry);
        addBelow(node, std::string{inside} + ":" + std::string{behind.substr(behind.starts_with(':') ? 1 : 0)}, query,
                 entry);
        return;
    }
    const std::size_t end = std::min(rest.find_first_of(":["), rest.size());
    const std::string_view mnemonic = rest.substr(0, end);
    rest.remove_prefix(end);
    if (rest == ":")
        rest = {};
    addBelow(node.child(mnemonic), rest, query, entry);
}

std::vector<std::string> CommandTable::headers() const
{
    std::vector<std::string> result;
    collect(*m_common, "*", result);
    collect(*m_root, "", result);
    return result;
}

void CommandTable::collect(const Node &node, const std::string &path, std::vector<std::string> &headers)
{
    for (const auto &child : node.children) {
        std::string mnemonic = child->longForm;
        std::transform(mnemonic.begin() + static_cast<std::ptrdiff_t>(child->shortLength), mnemonic.end(),
                       mnemonic.begin() + static_cast<std::ptrdiff_t>(child->shortLength), toLower);
        const std::string header = path + mnemonic + (child->takesSuffix ? "#" : "");
        if (child->set || child->query)
            headers.push_back(header);
        collect(*child, header + ":", headers);
    }
}

CommandTable::Match CommandTable::find(const CommandHeader &header, const Node *path,
                                       const std::vector<unsigned> &pathSuffixes) const
{
    Match match{nullptr, {}, path, pathSuffixes};
    const Node *node = m_root.get();
    if (header.common) {
        node = m_common.get();
    } else if (!header.absolute && path != nullptr) {
        node = path;
        match.suffixes = pathSuffixes;
    }
    for (const std::string_view mnemonic : header.mnemonics) {
        if (!header.common) {
            match.path = node;
            match.pathSuffixes = match.suffixes;
        }
        unsigned suffix = 1;
        const auto next = std::find_if(node->children.begin(), node->children.end(),
                                       [&](const auto &child) { return names(*child, mnemonic, suffix); });
        if (next == node->children.end())
            throw ScpiError{isOtherwiseKnown(*node, mnemonic) ? -114 : -113, std::string{header.text}};
        node = next->get();
        if (node->takesSuffix)
            match.suffixes.push_back(suffix);
    }
    match.entry = header.query ? node->query : node->set;
    if (match.entry == nullptr)
        throw ScpiError{-113, std::string{header.text}};
    return match;
}

} // namespace simulator
