#include "simulator/server/FaultySend.h"

#include "simulator/instrument/Bytes.h"

#include <algorithm>
#include <utility>

namespace simulator
{
namespace
{

/// The bytes of a message as one row, without joining its pieces.
class Editor
{
public:
    explicit Editor(std::vector<Outgoing> &pieces) : m_pieces(pieces) {}

    std::uint8_t byteAt(std::size_t at) const
    {
        for (const Outgoing &piece : m_pieces) {
            if (at < piece.text.size())
                return static_cast<std::uint8_t>(piece.text[at]);
            at -= piece.text.size();
            if (at < piece.bytes.size())
                return static_cast<std::uint8_t>(piece.bytes[at]);
            at -= piece.bytes.size();
        }
        return 0;
    }

    void setByteAt(std::size_t at, std::uint8_t value)
    {
        Outgoing &piece = m_pieces[isolate(at)];
        piece.text[0] = static_cast<char>(value);
    }

    void truncate(std::size_t size)
    {
        const auto from = static_cast<std::ptrdiff_t>(cutAt(size));
        m_pieces.erase(m_pieces.begin() + from, m_pieces.end());
    }

    void erase(std::size_t at, std::size_t count)
    {
        const auto from = static_cast<std::ptrdiff_t>(cutAt(at));
        const auto to = static_cast<std::ptrdiff_t>(cutAt(at + count));
        m_pieces.erase(m_pieces.begin() + from, m_pieces.begin() + to);
    }

    std::uint64_t number(const NumberField &field) const
    {
        std::uint64_t value = 0;
        for (std::size_t i = 0; i < field.size; ++i)
            value = value << 8 | byteAt(field.at + i);
        return value;
    }

    void setNumber(const NumberField &field, std::uint64_t value)
    {
        const std::uint64_t whole = (number(field) & ~field.mask) | (value & field.mask);
        for (std::size_t i = 0; i < field.size; ++i)
            setByteAt(field.at + i, static_cast<std::uint8_t>(whole >> 8 * (field.size - 1 - i)));
    }

private:
    /// Makes a piece begin at this byte: its index.
    std::size_t cutAt(std::size_t at)
    {
        std::size_t index = 0;
        while (index < m_pieces.size() && at >= m_pieces[index].size())
            at -= m_pieces[index++].size();
        if (at == 0 || index == m_pieces.size())
            return index;
        Outgoing &first = m_pieces[index];
        Outgoing second;
        if (at < first.text.size()) {
            second = {first.text.substr(at), std::move(first.keeper), first.bytes};
            first.text.resize(at);
            first.bytes = {};
        } else {
            const std::size_t inBlock = at - first.text.size();
            second = {{}, first.keeper, first.bytes.subspan(inBlock)};
            first.bytes = first.bytes.first(inBlock);
        }
        m_pieces.insert(m_pieces.begin() + static_cast<std::ptrdiff_t>(index) + 1, std::move(second));
        return index + 1;
    }

    /// Makes one byte a piece of its own, as text: its index.
    std::size_t isolate(std::size_t at)
    {
        const std::size_t index = cutAt(at);
        cutAt(at + 1);
        Outgoing &piece = m_pieces[index];
        if (piece.text.empty())
            piece = {std::string(1, static_cast<char>(piece.bytes[0])), nullptr, {}};
        return index;
    }

    std::vector<Outgoing> &m_pieces;
};

std::string noise(std::uint64_t bytes, std::uint64_t seed)
{
    std::mt19937_64 random(seed);
    std::string result(static_cast<std::size_t>(bytes), '\0');
    for (char &c : result)
        c = static_cast<char>(random() & 0xFF);
    return result;
}

void damageBytes(const Damage &damage, const MessageForm &form, Editor &editor, std::size_t size)
{
    if (damage.staleId)
        editor.setNumber(form.id, editor.number(form.id) - form.idStep);
    if (damage.announced)
        editor.setNumber(form.length, *damage.announced);
    if (damage.changedByte) {
        const auto at = form.payloadAt + static_cast<std::size_t>(*damage.changedByte);
        editor.setByteAt(at, editor.byteAt(at) ^ 1);
    }
    // The ones that move what is behind them come last.
    if (damage.noEnd && form.end == EndMark::Byte)
        editor.setByteAt(form.endAt, form.openEnd);
    if (damage.noEnd && form.end == EndMark::LastByte)
        editor.truncate(size - 1);
    if (damage.headerKept)
        editor.erase(*damage.headerKept, form.header - *damage.headerKept);
}

} // namespace

Delivery passFaults(Faults &faults, const MessageForm &form, std::vector<Outgoing> &message)
{
    const std::size_t size = sizeOf(message);
    const std::optional<Damage> damage = faults.strike(form, size);
    if (!damage)
        return {};
    if (damage->drop)
        return {.dropped = true};
    Editor editor(message);
    damageBytes(*damage, form, editor, size);
    if (damage->garbageBytes) {
        constexpr std::uint64_t MostNoise = std::uint64_t{1} << 20;
        message.clear();
        message.push_back({noise(std::min(*damage->garbageBytes, MostNoise), damage->garbageSeed), nullptr, {}});
    }
    if (damage->cutAt)
        editor.truncate(static_cast<std::size_t>(*damage->cutAt));
    return {false, damage->cutAt.has_value(), damage->delay};
}

} // namespace simulator
