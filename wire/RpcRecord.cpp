#include "RpcRecord.h"

#include <algorithm>

namespace wire::rpc
{
namespace
{

constexpr unsigned MaxEmptyFragments = 16;

/// A buffer that grew beyond this for one long record is given back afterwards.
constexpr std::size_t KeptCapacity = 1u << 21;

} // namespace

std::size_t beginRecord(xdr::Writer &writer)
{
    const std::size_t begun = writer.position();
    writer.u32(0);
    return begun;
}

void finishRecord(xdr::Writer &writer, std::size_t begun, std::size_t following)
{
    const std::size_t length = writer.position() - begun - MarkSize + following;
    writer.patch(begun, encodeMark({true, static_cast<std::uint32_t>(length)}));
}

std::size_t RecordReader::feed(xdr::Bytes bytes)
{
    std::size_t used = 0;
    while (m_state == State::NeedMore && used < bytes.size()) {
        if (m_markBytes < MarkSize) {
            m_markWord = m_markWord << 8 | std::to_integer<std::uint32_t>(bytes[used++]);
            if (++m_markBytes == MarkSize)
                beginFragment();
            continue;
        }
        const std::size_t count = std::min(m_left, bytes.size() - used);
        m_record.insert(m_record.end(), bytes.begin() + static_cast<std::ptrdiff_t>(used),
                        bytes.begin() + static_cast<std::ptrdiff_t>(used + count));
        used += count;
        m_left -= count;
        if (m_left == 0)
            endFragment();
    }
    return used;
}

void RecordReader::beginFragment()
{
    const Mark mark = decodeMark(m_markWord);
    m_last = mark.last;
    m_left = mark.length;
    if (mark.length > m_limit - m_record.size()) {
        m_state = State::Refused;
    } else if (mark.length == 0) {
        // Legal and useless; an endless row of them would never become a record.
        if (!m_last && ++m_emptyFragments > MaxEmptyFragments)
            m_state = State::Refused;
        else
            endFragment();
    }
}

void RecordReader::endFragment()
{
    m_markBytes = 0;
    m_markWord = 0;
    if (m_last)
        m_state = State::Complete;
}

void RecordReader::next()
{
    m_state = State::NeedMore;
    m_emptyFragments = 0;
    m_record.clear();
    if (m_record.capacity() > KeptCapacity)
        m_record.shrink_to_fit();
}

} // namespace wire::rpc
