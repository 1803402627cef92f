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
    m_busy = true;
    m_xid = call.xid;
    if (const std::optional<rpc::Reply> answer = replyWithoutProgram(form, call, m_programs))
        reply(*answer, {}, {});
    else
        m_client.called(call, reader);
}

void RpcConnection::succeed(std::span<const std::byte> results, std::vector<Outgoing> following)
{
    reply(rpc::success(m_xid), results, std::move(following));
}

void RpcConnection::refuse(rpc::AcceptStatus status)
{
    reply(rpc::refuse(m_xid, status), {}, {});
}

void RpcConnection::reply(const rpc::Reply &reply, std::span<const std::byte> results, std::vector<Outgoing> following)
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
