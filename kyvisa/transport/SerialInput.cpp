#include "kyvisa/transport/SerialInput.h"

namespace kyvisa
{
namespace
{

constexpr std::byte Mark{0xFF};
constexpr std::byte WithError{0x00};

} // namespace

std::span<const std::byte> SerialInput::data() const
{
    return std::span(m_bytes).subspan(m_begin);
}

void SerialInput::received(std::size_t count)
{
    m_rawBegin = 0;
    m_rawEnd = count;
    decode();
}

/// Goes on to the end of the piece or to the next error.
void SerialInput::decode()
{
    m_bytes.clear();
    m_begin = 0;
    while (m_rawBegin < m_rawEnd && !m_error) {
        const std::byte byte = m_raw[m_rawBegin++];
        if (m_marks == 0 && byte == Mark) {
            m_marks = 1;
        } else if (m_marks == 1 && byte == WithError) {
            m_marks = 2;
        } else {
            m_error = m_marks == 2;
            m_bytes.push_back(m_error ? m_replacement : byte);
            m_marks = 0;
        }
    }
}

void SerialInput::errorTold()
{
    m_error = false;
    decode();
}

void SerialInput::clear()
{
    m_bytes.clear();
    m_begin = m_rawBegin = m_rawEnd = 0;
    m_marks = 0;
    m_error = false;
}

} // namespace kyvisa
