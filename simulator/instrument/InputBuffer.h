#pragma once

#include "simulator/instrument/Bytes.h"

#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <vector>

namespace simulator
{

/// The content of one block parameter, held apart from the text in which it stood.
struct Block {
    std::size_t at;        ///< offset in the unit's text of the '#' that stands for it
    Bytes bytes;           ///< as much of it as came and fitted
    bool complete = false; ///< false when the message ended inside
    bool refused = false;  ///< true when there was no room for all of it
};

/// One program message unit: what stands between `;` or terminators.
struct MessageUnit {
    static constexpr std::size_t MaxBlocks = 1024;

    std::string text;          ///< without leading white space; a block is a single '#'
    std::vector<Block> blocks; ///< at most MaxBlocks
    bool overrun = false;      ///< beyond the limits: text or blocks are incomplete
};

struct InputLimits {
    std::size_t message; ///< bytes of a program message, blocks included
    std::size_t text;    ///< bytes of a unit without its blocks
};

/**
 * The input buffer of the IEEE 488.2 message exchange: cuts the byte stream into program message units.
 *
 * Bytes may arrive in pieces of any size. Strings and blocks are understood before a terminator is looked for: a line feed or `;`
 * inside them is content. A message ends with NL, with END, or with both on the same byte; a transport without END ends it with NL alone, and there
 * an indefinite block, which only END can close, is left for the parser to refuse.
 *
 * Block content can skip the buffer: while blockSpace() is not empty, the next bytes belong there.
 */
class InputBuffer
{
public:
    enum class Found { Nothing, Unit, Message };

    InputBuffer(std::shared_ptr<ByteBudget> budget, InputLimits limits, bool hasEnd);

    /// Takes bytes from the front of @p bytes up to and including the next `;` or NL. Unit or Message: unit() is complete.
    Found scan(std::span<const std::byte> &bytes);
    /// END came with the last byte scanned. Message unless that byte, as NL, has ended it already.
    Found end();

    std::span<std::byte> blockSpace();
    void blockFilled(std::size_t count);

    MessageUnit &unit() { return m_unit; }
    /// The unit was executed; the next one begins.
    void nextUnit();
    /// True between the first byte of a message and its end.
    bool inMessage() const { return m_messageBytes != 0; }
    void clear();

private:
    enum class State : std::uint8_t {
        Start,
        Header,
        Data,
        String,
        BlockStart,
        BlockDigits,
        BlockLong,
        Definite,
        Indefinite
    };

    Found scanText(std::span<const std::byte> &bytes);
    void takeBlock(std::span<const std::byte> &bytes);
    void beginBlock(std::uint64_t length, State state);
    void blockProgress(std::size_t count);
    Found finish(Found found);
    void store(char c);
    void countBytes(std::size_t count);
    /// Takes a byte of a block's header. False when it makes that no block header at all.
    bool blockHeader(char c);

    std::shared_ptr<ByteBudget> m_budget;
    const InputLimits m_limits;
    const bool m_hasEnd;

    MessageUnit m_unit;
    State m_state = State::Start;
    char m_quote = 0;
    bool m_elementStart = false;     ///< a quote or '#' here begins a parameter
    std::size_t m_headerAt = 0;      ///< offset of the '#' of the block header being read
    unsigned m_headerDigits = 0;     ///< of it still to come
    std::uint64_t m_blockLength = 0; ///< read so far from the header; then bytes still to come
    std::uint64_t m_messageBytes = 0;
};

} // namespace simulator
