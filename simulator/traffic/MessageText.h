#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>

namespace simulator
{

/**
 * A message as one readable line, made while its bytes pass by: control bytes and what is not ASCII as escapes, the content of a block as its length, and from a
 * certain length on only the count. Keeps a few hundred characters, however long the message is.
 *
 *     MMEM:DATA 'f',#41024<1024 bytes>\n
 */
class MessageText
{
public:
    static constexpr std::size_t MaxText = 240;

    void add(std::span<const std::byte> bytes);
    void add(std::string_view text) { add(std::as_bytes(std::span(text))); }
    /// Bytes of a block that pass by elsewhere.
    void skip(std::uint64_t count);
    bool empty() const { return m_total == 0; }
    /// The line so far. The next message begins.
    std::string take();

private:
    enum class State : std::uint8_t { Text, String, Hash, Digits, Block, Rest };

    void addByte(char c);
    void show(char c);
    void append(std::string_view text);
    void endBlock();

    State m_state = State::Text;
    char m_quote = 0;
    unsigned m_digits = 0;      ///< of a block's length still to come
    std::uint64_t m_length = 0; ///< of the block
    std::uint64_t m_left = 0;   ///< of the block's bytes
    std::uint64_t m_seen = 0;   ///< of the block's bytes
    std::uint64_t m_total = 0;
    bool m_cut = false;
    std::string m_text;
};

} // namespace simulator
