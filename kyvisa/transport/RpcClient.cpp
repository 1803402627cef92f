#include "kyvisa/transport/RpcClient.h"

#include <algorithm>
#include <cstring>
#include <new>

namespace kyvisa
{

using namespace wire;
using os::IoResult;

namespace
{

constexpr std::size_t InputCapacity = 16 * 1024;
constexpr unsigned MaxEmptyFragments = 16;

std::uint32_t wordAt(std::span<const std::byte> bytes, std::size_t position)
{
    return xdr::Reader(bytes.subspan(position)).u32();
}

} // namespace

// Transaction ids start somewhere else on each connection, so that captures of several can be told apart.
RpcClient::RpcClient(os::StreamSocket socket, std::uint32_t program, std::uint32_t version)
    : m_socket(std::move(socket)), m_program(program), m_version(version),
      m_xid(static_cast<std::uint32_t>(os::Deadline::now().end().time_since_epoch().count())), m_input(InputCapacity)
{
}

IoResult RpcClient::broken()
{
    m_socket.close();
    return IoResult::Closed;
}

xdr::Writer RpcClient::begin(std::uint32_t procedure)
{
    m_call.clear();
    xdr::Writer writer(m_call);
    rpc::beginRecord(writer);
    rpc::encode(writer, rpc::Call{++m_xid, m_program, m_version, procedure});
    return writer;
}

IoResult RpcClient::send(const os::WaitLimit &limit, std::span<const std::byte> data)
{
    m_awaitsReply = false;
    if (const IoResult rest = sendRest(limit); rest != IoResult::Done)
        return rest;
    static constexpr std::array<std::byte, 3> Zeros{};
    const std::size_t padding = xdr::padding(data.size());
    xdr::Writer writer(m_call);
    rpc::finishRecord(writer, 0, data.size() + padding);
    std::array pieces = {iovec{m_call.data(), m_call.size()}, iovec{const_cast<std::byte *>(data.data()), data.size()},
                         iovec{const_cast<std::byte *>(Zeros.data()), padding}};
    const auto whole = pieces;
    const std::size_t used = data.empty() ? 1 : padding == 0 ? 2 : 3;
    const os::Transfer sent = m_socket.send(std::span(pieces).first(used), limit);
    if (sent.result == IoResult::Done) {
        m_awaitsReply = true;
    } else if (sent.count > 0 && sent.result != IoResult::Closed) {
        auto rest = std::span(whole).first(used);
        std::size_t skip = sent.count;
        std::vector<iovec> left;
        for (const iovec &piece : rest) {
            const std::size_t gone = std::min(skip, piece.iov_len);
            left.push_back({static_cast<std::byte *>(piece.iov_base) + gone, piece.iov_len - gone});
            skip -= gone;
        }
        keepUnsent(left);
    }
    return sent.result;
}

void RpcClient::keepUnsent(std::span<const iovec> pieces)
{
    try {
        for (const iovec &piece : pieces) {
            const auto *begin = static_cast<const std::byte *>(piece.iov_base);
            m_unsent.insert(m_unsent.end(), begin, begin + piece.iov_len);
        }
    } catch (const std::bad_alloc &) {
        m_socket.close(); // the peer waits for bytes that nobody has any more
    }
}

IoResult RpcClient::sendRest(const os::WaitLimit &limit)
{
    if (m_unsent.empty())
        return IoResult::Done;
    std::array pieces = {iovec{m_unsent.data(), m_unsent.size()}};
    const os::Transfer sent = m_socket.send(pieces, limit);
    m_unsent.erase(m_unsent.begin(), m_unsent.begin() + static_cast<std::ptrdiff_t>(sent.count));
    if (m_unsent.empty())
        m_unsent.shrink_to_fit();
    return sent.result;
}

IoResult RpcClient::nextMark(const os::WaitLimit &limit)
{
    for (bool first = true; m_input.data().size() < rpc::MarkSize; first = false) {
        if (!first && limit.deadline.expired())
            return IoResult::TimedOut;
        if (const os::Transfer got = m_input.fill(m_socket, limit); got.result != IoResult::Done)
            return got.result;
    }
    const rpc::Mark mark = rpc::decodeMark(wordAt(m_input.data(), 0));
    m_input.consume(rpc::MarkSize);
    if (!m_inRecord)
        m_emptyFragments = 0;
    m_inRecord = true;
    m_lastFragment = mark.last;
    m_fragmentLeft = mark.length;
    // Legal and useless; an endless row of them would never become a record.
    if (mark.length == 0 && !mark.last && ++m_emptyFragments > MaxEmptyFragments)
        return broken();
    return IoResult::Done;
}

/// Moves what is here, at least one byte. Done with none at the end of the record.
os::Transfer RpcClient::takeSome(std::span<std::byte> to, const os::WaitLimit &limit)
{
    while (m_fragmentLeft == 0) {
        if (m_inRecord && m_lastFragment)
            return {IoResult::Done, 0};
        if (const IoResult marked = nextMark(limit); marked != IoResult::Done)
            return {marked, 0};
    }
    to = to.first(std::min(to.size(), m_fragmentLeft));
    os::Transfer got;
    if (m_input.empty() && to.size() < m_input.capacity())
        got = m_input.fill(m_socket, limit);
    if (got.result != IoResult::Done)
        return {got.result, 0};
    got = m_input.empty() ? m_socket.receive(to, limit) : os::Transfer{IoResult::Done, m_input.take(to)};
    m_fragmentLeft -= got.count;
    return got;
}

os::Transfer RpcClient::take(std::span<std::byte> to, const os::WaitLimit &limit)
{
    // Nearly always the whole reply is here already.
    if (to.size() <= m_fragmentLeft && to.size() <= m_input.data().size()) {
        m_fragmentLeft -= to.size();
        return {IoResult::Done, m_input.take(to)};
    }
    os::Transfer done;
    while (done.count < to.size()) {
        if (done.count > 0 && limit.deadline.expired())
            return {IoResult::TimedOut, done.count};
        const os::Transfer got = takeSome(to.subspan(done.count), limit);
        done.count += got.count;
        done.result = got.result;
        if (got.result == IoResult::Done && got.count == 0)
            done.result = broken();
        if (done.result != IoResult::Done)
            return done;
    }
    return done;
}

IoResult RpcClient::skipRecord(const os::WaitLimit &limit)
{
    std::array<std::byte, 4096> unwanted;
    for (bool first = true; m_inRecord; first = false) {
        if (!first && limit.deadline.expired())
            return IoResult::TimedOut;
        const os::Transfer got = takeSome(unwanted, limit);
        if (got.result != IoResult::Done)
            return got.result;
        if (got.count == 0)
            m_inRecord = false;
    }
    m_headerSize = 0;
    m_stage = Stage::Header;
    return IoResult::Done;
}

IoResult RpcClient::fillHeader(std::size_t size, const os::WaitLimit &limit)
{
    if (size <= m_headerSize)
        return IoResult::Done;
    const os::Transfer got = take(std::span(m_header).subspan(m_headerSize, size - m_headerSize), limit);
    m_headerSize += got.count;
    return got.result;
}

/// The header's length follows from what it says: first the part that all replies have.
IoResult RpcClient::receiveHeader(rpc::Reply &reply, const os::WaitLimit &limit)
{
    constexpr std::size_t Common = 12;
    constexpr std::uint32_t Denied = 1;
    if (const IoResult result = fillHeader(Common, limit); result != IoResult::Done)
        return result;
    std::size_t size = Common + 4;
    if (wordAt(m_header, 8) == Denied) {
        if (const IoResult result = fillHeader(size, limit); result != IoResult::Done)
            return result;
        size += wordAt(m_header, Common) == static_cast<std::uint32_t>(rpc::RejectStatus::RpcMismatch) ? 8 : 4;
    } else {
        if (const IoResult result = fillHeader(Common + 8, limit); result != IoResult::Done)
            return result;
        const std::uint32_t verifier = wordAt(m_header, Common + 4);
        if (verifier > rpc::MaxAuthLength)
            return broken();
        size = Common + 8 + verifier + xdr::padding(verifier) + 4;
        if (const IoResult result = fillHeader(size, limit); result != IoResult::Done)
            return result;
        if (wordAt(m_header, size - 4) == static_cast<std::uint32_t>(rpc::AcceptStatus::ProgramMismatch))
            size += 8;
    }
    if (const IoResult result = fillHeader(size, limit); result != IoResult::Done)
        return result;
    xdr::Reader reader(xdr::Bytes(m_header).first(size));
    if (!rpc::decode(reader, reply))
        return broken();
    m_stage = Stage::Results;
    return IoResult::Done;
}

IoResult RpcClient::receive(rpc::Reply &reply, const os::WaitLimit &limit)
{
    for (bool first = true;; first = false) {
        if (!first && limit.deadline.expired())
            return IoResult::TimedOut;
        // A header that was interrupted goes on where it stopped; anything else of an earlier record is in the way.
        if (m_stage == Stage::Results) {
            if (const IoResult skipped = skipRecord(limit); skipped != IoResult::Done)
                return skipped;
        }
        if (const IoResult result = receiveHeader(reply, limit); result != IoResult::Done)
            return result;
        if (reply.xid == m_xid) {
            m_awaitsReply = false;
            return IoResult::Done;
        }
    }
}

} // namespace kyvisa
