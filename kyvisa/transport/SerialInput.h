#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace kyvisa
{

/**
 * What a serial port has received, with the marks of errors taken out: a byte that came with an error is replaced, and the
 * input stops behind it until the error was told.
 */
class SerialInput
{
public:
    void setReplacement(std::uint8_t byte) { m_replacement = static_cast<std::byte>(byte); }

    /// Room for the next piece from the port.
    std::span<std::byte> room() { return m_raw; }
    /// That many bytes came. Only when everything before was taken.
    void received(std::size_t count);

    std::span<const std::byte> data() const;
    /// Also when an error waits.
    bool empty() const { return m_begin == m_bytes.size() && m_rawBegin == m_rawEnd && !m_error; }
    void consume(std::size_t count) { m_begin += count; }
    /// The byte before was received with an error, and nobody knows yet.
    bool atError() const { return m_error && m_begin == m_bytes.size(); }
    void errorTold();
    void clear();

private:
    void decode();

    std::array<std::byte, 4096> m_raw;
    std::size_t m_rawBegin = 0;
    std::size_t m_rawEnd = 0;
    std::vector<std::byte> m_bytes;
    std::size_t m_begin = 0;
    int m_marks = 0; ///< bytes of a mark that have come: 0, 1 (FF) or 2 (FF 00)
    bool m_error = false;
    std::byte m_replacement{0};
};

} // namespace kyvisa
