#include "soak/SoakClients.h"

#include "soak/Stream.h"

#include <mutex>
#include <stdexcept>

namespace soak
{
namespace
{

void require(bool held, const char *what)
{
    if (!held)
        throw std::runtime_error(what);
}

/// A line for a line, where an answer is a definite-length block or text.
class LineClient final : public Client
{
public:
    template <typename Place>
    explicit LineClient(const Place &place) : m_stream(place)
    {
    }

    std::string query(std::string_view message) override
    {
        m_stream.send(message);
        std::string answer = m_stream.receive(2);
        if (answer.front() == '#') {
            answer += m_stream.receive(static_cast<std::size_t>(answer[1] - '0'));
            return answer + m_stream.receive(std::stoul(answer.substr(2)) + 1);
        }
        while (answer.back() != '\n')
            answer += m_stream.receive(1);
        return answer;
    }

private:
    Stream m_stream;
};

class HislipClient final : public Client
{
public:
    HislipClient(std::uint16_t port, bool overlapped) : m_sync(port), m_async(port), m_overlapped(overlapped)
    {
        send(m_sync, Initialize, 0, 0x01005A5A, "hislip0");
        const Header session = receive(m_sync);
        require(session.type == InitializeResponse, "no InitializeResponse");
        send(m_async, AsyncInitialize, 0, session.parameter & 0xFFFF);
        require(receive(m_async).type == AsyncInitializeResponse, "no AsyncInitializeResponse");
        if (overlapped)
            changeMode();
    }

    std::string query(std::string_view message) override
    {
        send(m_sync, DataEnd, m_delivered ? 1 : 0, m_id, message);
        m_delivered = false;
        std::string answer;
        while (true) {
            const Header header = receive(m_sync);
            require(header.type == Data || header.type == DataEnd, "no data");
            require(header.parameter == (m_overlapped ? m_serverId : m_id), "another message id");
            m_serverId += 2;
            answer += m_sync.receive(static_cast<std::size_t>(header.length));
            if (header.type == DataEnd)
                break;
        }
        m_id += 2;
        m_delivered = true;
        return answer;
    }

private:
    enum Type : unsigned {
        Initialize = 0,
        InitializeResponse = 1,
        Data = 6,
        DataEnd = 7,
        DeviceClearComplete = 8,
        DeviceClearAcknowledge = 9,
        AsyncInitialize = 17,
        AsyncInitializeResponse = 18,
        AsyncDeviceClear = 19,
        AsyncDeviceClearAcknowledge = 23,
    };
    struct Header {
        unsigned type;
        unsigned control;
        std::uint32_t parameter;
        std::uint64_t length;
    };

    /// A device clear that asks for overlapped mode.
    void changeMode()
    {
        send(m_async, AsyncDeviceClear, 0, 0);
        require(receive(m_async).type == AsyncDeviceClearAcknowledge, "no AsyncDeviceClearAcknowledge");
        send(m_sync, DeviceClearComplete, 1, 0);
        const Header final = receive(m_sync);
        require(final.type == DeviceClearAcknowledge && final.control == 1, "no overlapped mode");
    }

    static void send(Stream &to, unsigned type, unsigned control, std::uint32_t parameter,
                     std::string_view payload = {})
    {
        std::string message =
            "HS" + bigEndian(type, 1) + bigEndian(control, 1) + bigEndian(parameter, 4) + bigEndian(payload.size(), 8);
        to.send(message.append(payload));
    }
    static Header receive(Stream &from)
    {
        const std::string bytes = from.receive(16);
        require(bytes.starts_with("HS"), "no HiSLIP header");
        const std::string_view view = bytes;
        return {static_cast<unsigned>(fromBigEndian(view.substr(2, 1))),
                static_cast<unsigned>(fromBigEndian(view.substr(3, 1))),
                static_cast<std::uint32_t>(fromBigEndian(view.substr(4, 4))), fromBigEndian(view.substr(8, 8))};
    }

    Stream m_sync;
    Stream m_async;
    const bool m_overlapped;
    std::uint32_t m_id = 0xFFFFFF00;
    std::uint32_t m_serverId = 0xFFFFFF00;
    bool m_delivered = false;
};

/// All links to inst0 share one output queue, so that its clients must take turns. Now and then one locks the device for its turn; not always, since the others would
/// hardly be let in between.
class Vxi11Client final : public Client
{
public:
    Vxi11Client(std::uint16_t port, std::string_view device) : m_stream(port)
    {
        const std::string result = call(10, bigEndian(1, 4) + bigEndian(0, 4) + bigEndian(0, 4) + opaque(device));
        require(fromBigEndian(result.substr(0, 4)) == 0, "no link");
        m_link = result.substr(4, 4);
    }

    std::string query(std::string_view message) override
    {
        static std::mutex turn;
        const std::lock_guard guard(turn);
        const std::string time = bigEndian(30000, 4);
        const bool locks = ++m_queries % QueriesOfALock == 0;
        if (locks)
            expectDone(call(18, m_link + bigEndian(WaitForLock, 4) + time), "no lock");
        expectDone(call(11, m_link + time + time + bigEndian(WaitForLock | End, 4) + opaque(message)), "write refused");
        const std::string result =
            call(12, m_link + bigEndian(1024, 4) + time + time + bigEndian(WaitForLock, 4) + bigEndian(0, 4));
        expectDone(result, "read refused");
        require(fromBigEndian(result.substr(4, 4)) == EndReason, "no END");
        if (locks)
            expectDone(call(19, m_link), "lock lost");
        return result.substr(12, static_cast<std::size_t>(fromBigEndian(result.substr(8, 4))));
    }

private:
    static constexpr unsigned QueriesOfALock = 50;
    static constexpr unsigned WaitForLock = 1;
    static constexpr unsigned End = 8;
    static constexpr unsigned EndReason = 4;

    static void expectDone(const std::string &result, const char *what)
    {
        require(fromBigEndian(result.substr(0, 4)) == 0, what);
    }
    static std::string opaque(std::string_view data)
    {
        return bigEndian(data.size(), 4).append(data).append((4 - data.size() % 4) % 4, '\0');
    }

    std::string call(unsigned procedure, const std::string &arguments)
    {
        const std::string message = bigEndian(++m_xid, 4) + bigEndian(0, 4) + bigEndian(2, 4) + bigEndian(0x0607AF, 4) +
                                    bigEndian(1, 4) + bigEndian(procedure, 4) + std::string(16, '\0') + arguments;
        m_stream.send(bigEndian(0x80000000u | message.size(), 4) + message);
        const std::uint64_t mark = fromBigEndian(m_stream.receive(4));
        std::string reply = m_stream.receive(static_cast<std::size_t>(mark & 0x7FFFFFFF));
        require((mark & 0x80000000u) != 0 && reply.size() >= 28, "a short reply");
        require(fromBigEndian(reply.substr(0, 4)) == m_xid, "a reply to another call");
        require(fromBigEndian(reply.substr(20, 4)) == 0, "call refused");
        return reply.substr(24);
    }

    Stream m_stream;
    std::string m_link;
    std::uint32_t m_xid = 0;
    unsigned m_queries = 0;
};

} // namespace

std::unique_ptr<Client> connect(Kind kind, const Places &places)
{
    switch (kind) {
    case Kind::Socket:
        return std::make_unique<LineClient>(places.socket);
    case Kind::HislipSynchronized:
        return std::make_unique<HislipClient>(places.hislip, false);
    case Kind::HislipOverlapped:
        return std::make_unique<HislipClient>(places.hislip, true);
    case Kind::Vxi11:
        return std::make_unique<Vxi11Client>(places.vxi11, "inst0");
    case Kind::Bus7:
        return std::make_unique<Vxi11Client>(places.vxi11, "gpib0,7");
    case Kind::Bus9:
        return std::make_unique<Vxi11Client>(places.vxi11, "gpib0,9,1");
    case Kind::Serial:
        return std::make_unique<LineClient>(places.serial);
    }
    throw std::logic_error("no such kind");
}

std::uint16_t vxi11Port(std::uint16_t portmapper)
{
    Stream stream(portmapper);
    const std::string call = bigEndian(1, 4) + bigEndian(0, 4) + bigEndian(2, 4) + bigEndian(100000, 4) +
                             bigEndian(2, 4) + bigEndian(3, 4) + std::string(16, '\0') + bigEndian(0x0607AF, 4) +
                             bigEndian(1, 4) + bigEndian(6, 4) + bigEndian(0, 4);
    stream.send(bigEndian(0x80000000u | call.size(), 4) + call);
    return static_cast<std::uint16_t>(fromBigEndian(stream.receive(32).substr(28)));
}

} // namespace soak
