#include "simulator/instrument/InputBuffer.h"

#include "simulator/instrument/Characters.h"

#include <algorithm>
#include <limits>
#include <utility>

namespace simulator
{
namespace
{
// "#(<length>)": what fits here is far beyond any message limit.
constexpr unsigned MaxLongDigits = 18;
// Of an indefinite block: how much room is asked for at a time.
constexpr std::size_t IndefiniteStep = 16 * 1024 * 1024;
} // namespace

InputBuffer::InputBuffer(std::shared_ptr<ByteBudget> budget, InputLimits limits, bool hasEnd)
    : m_budget(std::move(budget)), m_limits(limits), m_hasEnd(hasEnd)
{
}

InputBuffer::Found InputBuffer::scan(std::span<const std::byte> &bytes)
{
    while (!bytes.empty()) {
        if (m_state == State::Definite || m_state == State::Indefinite) {
            takeBlock(bytes);
        } else if (const Found found = scanText(bytes); found != Found::Nothing) {
            return found;
        }
    }
    return Found::Nothing;
}

InputBuffer::Found InputBuffer::scanText(std::span<const std::byte> &bytes)
{
    std::size_t used = 0;
    Found found = Found::Nothing;
    while (used < bytes.size() && found == Found::Nothing && m_state != State::Definite &&
           m_state != State::Indefinite) {
        const char c = static_cast<char>(bytes[used++]);
        const bool inHeaderOfBlock =
            m_state == State::BlockStart || m_state == State::BlockDigits || m_state == State::BlockLong;
        if (inHeaderOfBlock) {
            if (blockHeader(c))
                continue;
            // No block after all: the byte counts like any other of the text.
        }
        switch (m_state) {
        case State::String:
            store(c);
            if (c == m_quote)
                m_state = State::Data; // a doubled quote opens it again below
            continue;
        case State::Start:
            if (isWhiteSpace(c))
                continue;
            if (c != '\n' && c != ';')
                m_state = State::Header;
            break;
        case State::Header:
            if (isWhiteSpace(c)) {
                m_state = State::Data;
                m_elementStart = true;
                store(c);
                continue;
            }
            break;
        default:
            break;
        }
        if (c == '\n') {
            found = Found::Message;
        } else if (c == ';') {
            found = Found::Unit;
        } else if (m_state == State::Data && (c == '"' || c == '\'') && (m_elementStart || m_quote == c)) {
            store(c);
            m_quote = c;
            m_elementStart = false;
            m_state = State::String;
        } else if (m_state == State::Data && c == '#' && m_elementStart) {
            m_headerAt = m_unit.text.size();
            store(c);
            m_state = State::BlockStart;
        } else {
            store(c);
            m_elementStart = m_state == State::Data && (c == ',' || isWhiteSpace(c));
            m_quote = 0;
        }
    }
    bytes = bytes.subspan(used);
    countBytes(used);
    return finish(found);
}

bool InputBuffer::blockHeader(char c)
{
    const bool digit = c >= '0' && c <= '9';
    const auto value = static_cast<std::uint64_t>(c - '0');
    const State state = std::exchange(m_state, State::Data);
    m_elementStart = false;
    if (state == State::BlockStart) {
        if (c == '0' && m_hasEnd) {
            beginBlock(std::numeric_limits<std::uint64_t>::max(), State::Indefinite);
            return true;
        }
        const bool counted = digit && c != '0';
        if (!counted && c != '(')
            return false;
        store(c);
        m_headerDigits = counted ? static_cast<unsigned>(value) : MaxLongDigits;
        m_blockLength = 0;
        m_state = counted ? State::BlockDigits : State::BlockLong;
        return true;
    }
    if (digit && m_headerDigits > 0) {
        store(c);
        m_blockLength = m_blockLength * 10 + value;
        --m_headerDigits;
        if (state == State::BlockDigits && m_headerDigits == 0)
            beginBlock(m_blockLength, State::Definite);
        else
            m_state = state;
        return true;
    }
    if (state == State::BlockLong && c == ')' && m_headerDigits < MaxLongDigits) {
        beginBlock(m_blockLength, State::Definite);
        return true;
    }
    return false;
}

void InputBuffer::beginBlock(std::uint64_t length, State state)
{
    m_unit.text.resize(std::min(m_unit.text.size(), m_headerAt + 1));
    if (m_unit.blocks.size() < MessageUnit::MaxBlocks)
        m_unit.blocks.push_back({m_headerAt, Bytes(m_budget)});
    else
        m_unit.overrun = true; // what comes is read and thrown away
    m_blockLength = length;
    m_state = state;
    m_quote = 0;
    if (length == 0)
        blockProgress(0);
}

void InputBuffer::takeBlock(std::span<const std::byte> &bytes)
{
    Block &block = m_unit.blocks.back();
    const auto count = static_cast<std::size_t>(std::min<std::uint64_t>(bytes.size(), m_blockLength));
    if (!block.refused && !m_unit.overrun) {
        const std::size_t room = m_state == State::Definite ? static_cast<std::size_t>(m_blockLength) : IndefiniteStep;
        block.refused = !block.bytes.append(bytes.first(count), std::max(room, count));
    }
    bytes = bytes.subspan(count);
    countBytes(count);
    blockProgress(count);
}

std::span<std::byte> InputBuffer::blockSpace()
{
    if ((m_state != State::Definite && m_state != State::Indefinite) || m_unit.overrun || m_unit.blocks.back().refused)
        return {};
    const std::size_t room = m_state == State::Definite ? static_cast<std::size_t>(m_blockLength) : IndefiniteStep;
    return m_unit.blocks.back().bytes.space(room);
}

void InputBuffer::blockFilled(std::size_t count)
{
    m_unit.blocks.back().bytes.commit(count);
    countBytes(count);
    blockProgress(count);
}

void InputBuffer::blockProgress(std::size_t count)
{
    if (m_state == State::Indefinite)
        return;
    m_blockLength -= count;
    if (m_blockLength == 0) {
        m_unit.blocks.back().complete = true;
        m_state = State::Data;
        m_elementStart = false;
    }
}

InputBuffer::Found InputBuffer::end()
{
    if (!inMessage())
        return Found::Nothing;
    if (m_state == State::Indefinite) {
        Block &block = m_unit.blocks.back();
        if (block.bytes.size() > 0 && block.bytes.view().back() == std::byte{'\n'})
            block.bytes.dropLast();
        block.bytes.fit();
        block.complete = true;
    }
    return finish(Found::Message);
}

InputBuffer::Found InputBuffer::finish(Found found)
{
    if (found == Found::Message)
        m_messageBytes = 0;
    return found;
}

void InputBuffer::nextUnit()
{
    m_unit.text.clear();
    m_unit.blocks.clear();
    m_unit.overrun = false;
    m_state = State::Start;
    m_quote = 0;
    m_elementStart = false;
}

void InputBuffer::clear()
{
    nextUnit();
    m_messageBytes = 0;
}

void InputBuffer::store(char c)
{
    if (m_unit.text.size() < m_limits.text)
        m_unit.text.push_back(c);
    else
        m_unit.overrun = true;
}

void InputBuffer::countBytes(std::size_t count)
{
    m_messageBytes += count;
    if (m_messageBytes > m_limits.message)
        m_unit.overrun = true;
}

} // namespace simulator
