#pragma once

#include <cstddef>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace simulator
{

class Command;
struct CommandHeader;

/// How many parameters a command takes.
struct Arity {
    std::size_t least = 0;
    std::size_t most = 0;
};

/**
 * The commands that the instrument knows, found by their header.
 *
 * Patterns are written as in instrument manuals: upper case is the short form, brackets enclose what may be left out, `#` behind a mnemonic
 * allows a numeric suffix (1 when there is none), `?` makes it the query:
 *
 *     table.add("SOURce#:VOLTage[:LEVel]", {1, 1}, setVoltage);
 *     table.add("SOURce#:VOLTage[:LEVel]?", {0, 1}, tellVoltage);
 *
 * A node of the table is also what the compound rule of IEEE 488.2 calls the current path: behind `;` a header without leading colon
 * continues where the previous one's last mnemonic stood.
 */
class CommandTable
{
public:
    using Handler = std::function<void(Command &)>;

    struct Entry {
        Arity arity;
        Handler handler;
    };
    struct Node;

    struct Match {
        std::shared_ptr<const Entry> entry;
        std::vector<unsigned> suffixes; ///< of the mnemonics that take one, in order
        const Node *path;               ///< where the last mnemonic stood
        std::vector<unsigned> pathSuffixes;
    };

    CommandTable();
    ~CommandTable();

    /// A later entry replaces an earlier one of the same header.
    void add(std::string_view pattern, Arity arity, Handler handler);

    /// Finds the header, from @p path on unless it is absolute or common. Throws ScpiError -113 when there is none, -114 for a suffix too many.
    Match find(const CommandHeader &header, const Node *path, const std::vector<unsigned> &pathSuffixes) const;

    /// All headers, written as in patterns, without `?`.
    std::vector<std::string> headers() const;

private:
    static void collect(const Node &node, const std::string &path, std::vector<std::string> &headers);
    void addBelow(Node &node, std::string_view rest, bool query, const std::shared_ptr<const Entry> &entry);

    std::unique_ptr<Node> m_root;
    std::unique_ptr<Node> m_common;
};

} // namespace simulator
