#pragma once

#include "kyvisa/include/visatype.h"
#include "kyvisa/os/WaitLimit.h"
#include "kyvisa/transport/RpcClient.h"
#include "wire/Vxi11.h"

#include <array>
#include <optional>
#include <string>
#include <vector>

namespace kyvisa
{

struct ProgramAddress;

/**
 * The core channel of VXI-11: a connection on which an instrument executes one call after the other.
 *
 * A call has two times. The instrument is told what is left of the caller's, and answers when that is over. Its answer needs
 * time as well, so this end waits a second longer: without that an answer that says "time-out", with the bytes that were read
 * until then, would always come too late. See deviceTime() and patience().
 *
 * A call that another thread ends is aborted in the instrument, where it has an abort channel, so that the next one does not
 * have to wait behind it.
 */
class Vxi11Core
{
public:
    Vxi11Core(os::StreamSocket socket, std::string host);

    static ViStatus connect(const ProgramAddress &address, const os::WaitLimit &limit, os::StreamSocket &socket);

    bool isOpen() const { return m_rpc.isOpen(); }
    void close() { m_rpc.close(); }
    os::StreamSocket &socket() { return m_rpc.socket(); }
    const std::string &host() const { return m_host; }

    /// Milliseconds for the instrument. Never 0, which would be "do not wait" to some and "for ever" to others.
    static std::uint32_t deviceTime(const os::WaitLimit &limit);
    static os::WaitLimit patience(const os::WaitLimit &limit);

    /// The device's name decides what the link leads to. Its connection's abort port serves all links.
    ViStatus createLink(const std::string &device, const os::WaitLimit &limit, wire::vxi11::CreateLinkResult &link);
    /// Waits a moment for the answer and no longer, whatever the connection has been through.
    void destroyLink(wire::vxi11::LinkId link);
    /// The same for a lock that was asked for and may still be granted.
    void giveBackLock(wire::vxi11::LinkId link);

    /// @param taken receives the bytes that the instrument took, also on errors.
    ViStatus write(const wire::vxi11::WriteCall &call, const os::WaitLimit &limit, std::size_t &taken);
    /// Data goes straight into @p room. @param count receives its size, also on errors.
    ViStatus read(const wire::vxi11::ReadCall &call, std::span<std::byte> room, const os::WaitLimit &limit,
                  std::size_t &count, std::uint32_t &reason);
    ViStatus readStatusByte(const wire::vxi11::GenericCall &call, const os::WaitLimit &limit, ViUInt16 &status);
    /// Lets the instrument connect to @p where. One channel serves all links of the connection.
    ViStatus createInterruptChannel(const wire::vxi11::RemoteFunc &where, const os::WaitLimit &limit);
    /// device_docmd. @param answer receives the data that came back.
    ViStatus command(const wire::vxi11::DocmdCall &call, const os::WaitLimit &limit, std::vector<std::byte> &answer);
    /// Any procedure that answers an error and nothing else.
    template <typename Arguments>
    ViStatus call(wire::vxi11::Procedure procedure, const Arguments &arguments, const os::WaitLimit &limit)
    {
        begin(procedure, arguments);
        wire::vxi11::ErrorResult result;
        const ViStatus status = finish<4>(result, {}, limit);
        return status < 0 ? status : outcome(result.error);
    }

private:
    struct Nothing {
    };
    friend void encode(wire::xdr::Writer &, const Nothing &) {}

    template <typename Arguments>
    void begin(wire::vxi11::Procedure procedure, const Arguments &arguments)
    {
        auto writer = m_rpc.begin(static_cast<std::uint32_t>(procedure));
        if constexpr (requires { encodeHead(writer, arguments); })
            encodeHead(writer, arguments);
        else
            encode(writer, arguments);
        m_busyLink.reset();
        if constexpr (requires { arguments.link; })
            m_busyLink = arguments.link;
    }
    template <std::size_t Size, typename Result>
    ViStatus finish(Result &result, std::span<const std::byte> data, const os::WaitLimit &limit)
    {
        std::array<std::byte, Size> bytes{};
        const ViStatus status = transact(bytes, data, limit);
        wire::xdr::Reader reader(bytes);
        return status < 0 || decode(reader, result) ? status : lost();
    }
    ViStatus transact(std::span<std::byte> results, std::span<const std::byte> data, const os::WaitLimit &limit);
    ViStatus ended(os::IoResult result, const os::WaitLimit &limit);
    ViStatus outcome(wire::vxi11::Error error);
    ViStatus lost();
    void abortCall();

    RpcClient m_rpc;
    const std::string m_host; ///< the address that the connection leads to
    std::uint16_t m_abortPort = 0;
    std::optional<wire::vxi11::LinkId> m_busyLink; ///< of the call that was begun last
};

} // namespace kyvisa
