#include "simulator/traffic/MessageText.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <limits>
#include <utility>

namespace simulator
{

void MessageText::add(std::span<const std::byte> bytes)
{
    m_total += bytes.size();
    while (!bytes.empty() && !m_cut) {
        if (m_state == State::Block || m_state == State::Rest) {
            const auto count = static_cast<std::size_t>(std::min<std::uint64_t>(m_left, bytes.size()));
            m_seen += count;
            m_left -= count;
            bytes = bytes.subspan(count);
            if (m_left == 0)
                endBlock();
        } else {
            addByte(static_cast<char>(bytes.front()));
            bytes = bytes.subspan(1);
        }
    }
}

void MessageText::skip(std::uint64_t count)
{
    m_total += count;
    if (m_cut || (m_state != State::Block && m_state != State::Rest))
        return;
    m_seen += count;
    m_left -= std::min(m_left, count);
    if (m_left == 0)
        endBlock();
}

std::string MessageText::take()
{
    if (m_state == State::Block || m_state == State::Rest)
        endBlock();
    std::string text = std::move(m_text);
    if (m_cut)
        text += "... (" + std::to_string(m_total) + " bytes in all)";
    *this = {};
    return text;
}

void MessageText::addByte(char c)
{
    const bool digit = c >= '0' && c <= '9';
    switch (std::exchange(m_state, State::Text)) {
    case State::String:
        m_state = c == m_quote ? State::Text : State::String;
        break;
    case State::Hash:
        if (!digit)
            break; // #H1F and the like
        m_digits = static_cast<unsigned>(c - '0');
        m_length = 0;
        m_seen = 0;
        m_left = std::numeric_limits<std::uint64_t>::max();
        m_state = m_digits == 0 ? State::Rest : State::Digits;
        break;
    case State::Digits:
        if (!digit)
            break;
        m_length = m_length * 10 + static_cast<unsigned>(c - '0');
        m_state = State::Digits;
        if (--m_digits == 0) {
            m_left = m_length;
            m_state = State::Block;
        }
        break;
    default:
        if (c == '"' || c == '\'') {
            m_quote = c;
            m_state = State::String;
        } else if (c == '#') {
            m_state = State::Hash;
        }
    }
    show(c);
    if (m_state == State::Block && m_left == 0)
        endBlock();
}

void MessageText::show(char c)
{
    switch (c) {
    case '\n':
        return append("\\n");
    case '\r':
        return append("\\r");
    case '\t':
        return append("\\t");
    case '\\':
        return append("\\\\");
    default:
        break;
    }
    if (c >= ' ' && c < '\x7F')
        return append({&c, 1});
    std::array<char, 8> escape{};
    std::snprintf(escape.data(), escape.size(), "\\x%02X", static_cast<unsigned>(static_cast<unsigned char>(c)));
    append(escape.data());
}

void MessageText::append(std::string_view text)
{
    if (m_cut || m_text.size() + text.size() > MaxText)
        m_cut = true;
    else
        m_text += text;
}

void MessageText::endBlock()
{
    m_state = State::Text;
    append("<" + std::to_string(m_seen) + (m_seen == 1 ? " byte>" : " bytes>"));
}

} // namespace simulator
