#pragma once

#include "wire/Xdr.h"

/**
 * Record marking (RFC 5531, section 11): how RPC messages are told apart on a byte stream. A record is one or more fragments; each
 * begins with four bytes: the top bit says "last fragment of this record", the other 31 give the fragment's length.
 */
namespace wire::rpc
{

constexpr std::size_t MarkSize = 4;
constexpr std::uint32_t MaxFragment = 0x7FFFFFFF;

struct Mark {
    bool last = true;
    std::uint32_t length = 0;

    bool operator==(const Mark &) const = default;
};

constexpr std::uint32_t encodeMark(Mark mark)
{
    return (mark.last ? 0x80000000u : 0u) | (mark.length & MaxFragment);
}

constexpr Mark decodeMark(std::uint32_t word)
{
    return {(word & 0x80000000u) != 0, word & MaxFragment};
}

/// Leaves room for the mark of a record that is then written behind it in one fragment. Returns what finishRecord() needs.
std::size_t beginRecord(xdr::Writer &writer);

/// Fills the mark in. @p following counts bytes of the record that the caller sends from elsewhere.
void finishRecord(xdr::Writer &writer, std::size_t begun, std::size_t following = 0);

/**
 * Puts records together from whatever pieces a stream delivers.
 *
 *     while (!bytes.empty()) {
 *         bytes = bytes.subspan(reader.feed(bytes));
 *         if (reader.state() == RecordReader::State::Refused)
 *             close the connection: there is no way back to a record boundary
 *         if (reader.state() == RecordReader::State::Complete) {
 *             use reader.record();
 *             reader.next();
 *         }
 *     }
 *
 * Memory follows what has arrived, never what a mark announces. A record above the limit is refused when its mark arrives, and so are
 * fragments without content that are not the last one beyond a handful.
 */
class RecordReader
{
public:
    enum class State { NeedMore, Complete, Refused };

    /// @p limit: the longest record in bytes, marks not counted.
    explicit RecordReader(std::size_t limit) : m_limit(limit) {}

    /// Consumes at most to the end of the current record and returns how many bytes that were. None unless state() is NeedMore.
    std::size_t feed(xdr::Bytes bytes);
    State state() const { return m_state; }
    /// The record when complete, its beginning before. Valid until the next feed() or next().
    xdr::Bytes record() const { return m_record; }
    /// True between records: a stream that ends here ended cleanly.
    bool idle() const
    {
        return m_state == State::NeedMore && m_markBytes == 0 && m_record.empty() && m_left == 0 &&
               m_emptyFragments == 0;
    }
    /// Forgets a complete record and waits for the next one.
    void next();

private:
    void beginFragment();
    void endFragment();

    std::size_t m_limit;
    State m_state = State::NeedMore;
    std::vector<std::byte> m_record;
    std::uint32_t m_markWord = 0;
    unsigned m_markBytes = 0; ///< of the mark that is being read; MarkSize while inside a fragment
    std::size_t m_left = 0;   ///< bytes of the current fragment that have not arrived yet
    bool m_last = false;
    unsigned m_emptyFragments = 0;
};

} // namespace wire::rpc
