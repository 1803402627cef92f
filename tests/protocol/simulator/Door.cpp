#include "protocol/simulator/Door.h"

#include "protocol/simulator/Vxi11Client.h"

#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstring>

namespace test
{
namespace
{

constexpr int Patience = 30000; // milliseconds: only what never comes takes that long

class SocketDoor final : public Door
{
public:
    explicit SocketDoor(const SimulatorProcess &simulator) : m_client(simulator.port("socket")) {}

    void send(std::string_view piece, bool) override { m_client.send(piece); }
    std::string receive(std::size_t expectedSize) override { return m_client.receive(expectedSize); }
    bool hasStatus() const override { return false; }
    bool interrupts() const override { return false; }

private:
    RawClient m_client;
};

class SerialDoor final : public Door
{
public:
    explicit SerialDoor(const SimulatorProcess &simulator)
    {
        const std::string resource = simulator.resource("serial");
        const std::string port = resource.substr(4, resource.find("::") - 4);
        m_port = ::open(port.c_str(), O_RDWR | O_NOCTTY | O_NONBLOCK | O_CLOEXEC);
        EXPECT_GE(m_port, 0) << resource << ": " << std::strerror(errno);
    }
    ~SerialDoor() override { ::close(m_port); }

    void send(std::string_view piece, bool) override
    {
        while (!piece.empty()) {
            ASSERT_TRUE(ready(POLLOUT)) << "the port takes no more";
            const ssize_t count = ::write(m_port, piece.data(), piece.size());
            if (count > 0)
                piece.remove_prefix(static_cast<std::size_t>(count));
        }
    }
    std::string receive(std::size_t expectedSize) override
    {
        std::string text;
        std::array<char, 4096> piece;
        while (text.size() < expectedSize && ready(POLLIN)) {
            const ssize_t count = ::read(m_port, piece.data(), std::min(piece.size(), expectedSize - text.size()));
            if (count <= 0)
                break;
            text.append(piece.data(), static_cast<std::size_t>(count));
        }
        return text;
    }
    bool hasStatus() const override { return false; }
    bool interrupts() const override { return false; }

private:
    bool ready(short events) const
    {
        pollfd state{m_port, events, 0};
        return ::poll(&state, 1, Patience) == 1;
    }

    int m_port = -1;
};

class HislipDoor final : public Door
{
public:
    HislipDoor(const SimulatorProcess &simulator, bool overlapped)
        : m_client(simulator.port("hislip")), m_overlapped(overlapped)
    {
        if (overlapped)
            clear();
    }

    void send(std::string_view piece, bool end) override
    {
        m_sent = m_next;
        m_next += 2;
        m_client.sync.send(message(head(end ? 7 : 6, takeDelivered(), m_sent), piece));
    }

    std::string receive(std::size_t) override
    {
        std::string text;
        while (true) {
            const std::string header = m_client.sync.receive(16);
            if (header.size() < 16)
                return text;
            EXPECT_TRUE(header[2] == 6 || header[2] == 7) << "message type " << int{header[2]};
            m_received = RpcCaller::number(header.substr(4));
            text += m_client.sync.receive(RpcCaller::number(header.substr(12)));
            if (!m_overlapped && m_received != m_sent)
                text.clear(); // of an answer that a later message has interrupted
            else if (header[2] == 7)
                break;
        }
        m_delivered = true;
        return text;
    }

    bool interrupts() const override { return !m_overlapped; }

    unsigned poll() override
    {
        m_client.async.send(message(head(21, takeDelivered(), m_overlapped ? m_received : m_sent)));
        std::string header = m_client.async.receive(16);
        while (header.size() == 16 && header[2] == 20) // a service request
            header = m_client.async.receive(16);
        EXPECT_EQ(header.substr(0, 3), "HS\x16");
        return header.size() < 4 ? 0 : static_cast<unsigned char>(header[3]);
    }

    void clear() override
    {
        m_client.async.send(message("4853 13 00 00000000"));
        std::string header = m_client.async.receive(16);
        while (header.size() == 16 && header[2] != 23)
            header = m_client.async.receive(16);
        m_client.sync.send(message(m_overlapped ? "4853 08 01 00000000" : "4853 08 00 00000000"));
        header = m_client.sync.receive(16);
        while (header.size() == 16 && header[2] != 9) {
            m_client.sync.receive(RpcCaller::number(header.substr(12)));
            header = m_client.sync.receive(16);
        }
        EXPECT_EQ(header, message(m_overlapped ? "4853 09 01 00000000" : "4853 09 00 00000000"));
        m_next = 0xFFFFFF00u;
        m_sent = m_received = 0xFFFFFEFEu;
        m_delivered = false;
    }

    void trigger() override
    {
        m_sent = m_next;
        m_next += 2;
        m_client.sync.send(message(head(12, takeDelivered(), m_sent)));
    }

private:
    static std::string head(unsigned type, bool delivered, std::uint32_t id)
    {
        return RpcCaller::digits(RpcCaller::word(0x48530000u | type << 8 | (delivered ? 1 : 0))) +
               RpcCaller::digits(RpcCaller::word(id));
    }
    bool takeDelivered() { return std::exchange(m_delivered, false); }

    HislipClient m_client;
    const bool m_overlapped;
    std::uint32_t m_next = 0xFFFFFF00u;
    std::uint32_t m_sent = 0xFFFFFEFEu;
    std::uint32_t m_received = 0xFFFFFEFEu; ///< of the instrument's last message
    bool m_delivered = false;
};

class Vxi11Door final : public Door
{
public:
    Vxi11Door(const SimulatorProcess &simulator, std::string_view device) : m_client(corePort(simulator), device) {}

    void send(std::string_view piece, bool end) override
    {
        // No more at a time than the instrument said that it takes.
        constexpr std::size_t Most = 1024 * 1024;
        while (piece.size() > Most) {
            write(piece.substr(0, Most), false);
            piece.remove_prefix(Most);
        }
        write(piece, end);
    }
    std::string receive(std::size_t) override
    {
        std::string text;
        bool end = false;
        while (!end) {
            m_client.core.send("0000000C", m_client.link + "00100000 00007530 00000000 00000000 00000000");
            const std::string reply = m_client.core.reply();
            if (reply.size() < 36)
                break;
            EXPECT_EQ(RpcCaller::number(reply.substr(24)), 0u) << "error of device_read";
            end = RpcCaller::number(reply.substr(24)) != 0 || (RpcCaller::number(reply.substr(28)) & 4) != 0;
            text += reply.substr(36, RpcCaller::number(reply.substr(32)));
        }
        return text;
    }
    unsigned poll() override
    {
        const std::string result = m_client.statusByte();
        EXPECT_EQ(result.substr(0, 9), "00000000 ");
        return static_cast<unsigned>(std::stoul(result.substr(9, 8), nullptr, 16));
    }
    void clear() override { EXPECT_EQ(m_client.generic("0000000F"), "00000000 "); }
    void trigger() override { EXPECT_EQ(m_client.generic("0000000E"), "00000000 "); }

private:
    static std::uint16_t corePort(const SimulatorProcess &simulator)
    {
        RawClient client(static_cast<std::uint16_t>(std::stoi(simulator.resource("portmapper"))));
        client.send(
            fromHex("80000038 00000001 00000000 00000002 000186A0 00000002 00000003 00000000 00000000 00000000 00000000"
                    "000607AF 00000001 00000006 00000000"));
        return static_cast<std::uint16_t>(RpcCaller::number(client.receive(32).substr(28)));
    }

    void write(std::string_view piece, bool end)
    {
        EXPECT_EQ(m_client.write(piece, end ? "00000008" : "00000000"), "00000000 " + Vxi11Client::size(piece) + " ");
    }

    Vxi11Client m_client;
};

} // namespace

const std::vector<std::string> &doorNames()
{
    static const std::vector<std::string> names{"Socket", "Hislip", "HislipOverlapped", "Vxi11", "Gpib", "Serial"};
    return names;
}

const std::vector<std::string> &doorServices()
{
    static const std::vector<std::string> services{"--hislip",     "0", "--socket", "0",       "--vxi11", "0",
                                                   "--portmapper", "0", "--gpib",   "--serial"};
    return services;
}

std::unique_ptr<Door> openDoor(const std::string &name, const SimulatorProcess &simulator)
{
    if (name == "Socket")
        return std::make_unique<SocketDoor>(simulator);
    if (name == "Hislip" || name == "HislipOverlapped")
        return std::make_unique<HislipDoor>(simulator, name == "HislipOverlapped");
    if (name == "Serial")
        return std::make_unique<SerialDoor>(simulator);
    return std::make_unique<Vxi11Door>(simulator, name == "Gpib" ? "gpib0,5" : "inst0");
}

} // namespace test
