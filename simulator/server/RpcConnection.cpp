#include "simulator/server/RpcConnection.h"

#include <algorithm>
#include <utility>

namespace simulator
{

using namespace wire;

namespace
{

// More than this on its way to a client, and its next call waits.
constexpr std::size_t EnoughUnsent = 1024 * 1024;
constexpr std::chrono::minutes PatienceForLastReply{1};

/// A record with its mark, its transaction id, and @p header bytes in front of the results.
MessageForm rpcForm(MessageForm content, std::size_t header)
{
    constexpr std::uint64_t LengthOfMark = 0x7FFFFFFF;
    content.header = header;
    content.length = {0, 4, LengthOfMark};
    content.id = {4, 4};
    content.payloadAt += header;
    content.endAt += header;
    return content;
}

} // namespace

std::optional<rpc::Reply> replyWithoutProgram(rpc::CallForm form, const rpc::Call &call,
                                              std::span<const RpcProgram> programs)
{
    if (form == rpc::CallForm::OtherVersion)
        return rpc::denyVersion(call.xid);
    if (form == rpc::CallForm::BadCredentials)
        return rpc::denyAuthentication(call.xid);
    const auto program = std::find_if(programs.begin(), programs.end(),
                                      [&](const RpcProgram &each) { return each.number == call.program; });
    if (program == programs.end())
        return rpc::refuse(call.xid, rpc::AcceptStatus::ProgramUnavailable);
    if (program->version != call.version)
        return rpc::refuseVersion(call.xid, program->version, program->version);
    if (call.procedure == rpc::NullProcedure)
        return rpc::success(call.xid);
    return std::nullopt;
}

RpcConnection::RpcConnection(EventLoop &loop, FileDescriptor socket, std::span<const RpcProgram> programs,
                             std::size_t limit, Client &client)
    : m_programs(programs), m_client(client), m_reader(limit), m_connection(loop, std::move(socket), *this)
{
}

void RpcConnection::received()
{
    if (std::exchange(m_receiving, true))
        return;
    while (!m_busy && !m_ended && !m_connection.input().empty() && m_connection.unsent() < EnoughUnsent) {
        m_connection.consume(m_reader.feed(m_connection.input()));
        if (m_reader.state() == rpc::RecordReader::State::Complete)
            takeCall();
        else if (m_reader.state() == rpc::RecordReader::State::Refused)
            end();
    }
    m_receiving = false;
    if (m_ended || !m_connection.inputEnded())
        return;
    if (m_busy)
        end(); // nobody waits for the answer any more
    else if (m_connection.input().empty())
        m_connection.closeAfterSending(PatienceForLastReply);
}

void RpcConnection::takeCall()
{
    xdr::Reader reader(m_reader.record());
    rpc::Call call;
    const rpc::CallForm form = rpc::decode(reader, call);
    if (form == rpc::CallForm::NotACall)
        return end();
    m_busy = m_hasCalled = true;
    m_xid = call.xid;
    if (const std::optional<rpc::Reply> answer = replyWithoutProgram(form, call, m_programs))
        reply(*answer, {}, {}, {FaultProtocol::Vxi11});
    else
        m_client.called(call, reader);
}

void RpcConnection::succeed(std::span<const std::byte> results, std::vector<Outgoing> following,
                            const MessageForm &content)
{
    reply(rpc::success(m_xid), results, std::move(following), content);
}

void RpcConnection::refuse(rpc::AcceptStatus status)
{
    reply(rpc::refuse(m_xid, status), {}, {}, {FaultProtocol::Vxi11});
}

void RpcConnection::reply(const rpc::Reply &reply, std::span<const std::byte> results, std::vector<Outgoing> following,
                          const MessageForm &content)
{
    if (m_ended)
        return;
    std::size_t size = results.size();
    for (const Outgoing &piece : following)
        size += piece.size();
    m_buffer.clear();
    xdr::Writer writer(m_buffer);
    const std::size_t begun = rpc::beginRecord(writer);
    rpc::encode(writer, reply);
    rpc::finishRecord(writer, begun, size);

    std::string head;
    head.reserve(m_buffer.size() + results.size());
    head.append(reinterpret_cast<const char *>(m_buffer.data()), m_buffer.size());
    head.append(reinterpret_cast<const char *>(results.data()), results.size());
    following.insert(following.begin(), Outgoing{std::move(head), nullptr, {}});
    if (m_faults)
        m_connection.sendPast(*m_faults, rpcForm(content, m_buffer.size()), std::move(following));
    else
        m_connection.send(std::move(following));
    m_reader.next();
    m_busy = false;
    received();
}

void RpcConnection::end()
{
    if (!std::exchange(m_ended, true))
        m_client.closed();
}

} // namespace simulator
