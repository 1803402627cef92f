#pragma once

#include "protocol/simulator/RpcCaller.h"
#include "protocol/simulator/SimulatorFixture.h"

namespace test
{

/// A simulator with all its services that has to survive the test.
class Vxi11Fixture : public SimulatorFixture
{
protected:
    /// @p more: options beside the services.
    explicit Vxi11Fixture(const std::vector<std::string> &more = {}) : SimulatorFixture(services(more)) {}

    static std::vector<std::string> services(const std::vector<std::string> &more)
    {
        std::vector<std::string> options{"--hislip", "0", "--socket", "0", "--vxi11", "0", "--portmapper", "0"};
        options.insert(options.end(), more.begin(), more.end());
        return options;
    }

    /// Asks the portmapper for the port of the core program.
    std::uint16_t askForPort() const
    {
        RawClient client(portmapperPort);
        client.send(
            fromHex("80000038 00000001 00000000 00000002 000186A0 00000002 00000003 00000000 00000000 00000000 00000000"
                    "000607AF 00000001 00000006 00000000"));
        const std::string reply = client.receive(32);
        EXPECT_EQ(RpcCaller::digits(reply.substr(0, 28)),
                  "8000001C 00000001 00000001 00000000 00000000 00000000 00000000 ");
        return static_cast<std::uint16_t>(RpcCaller::number(reply.substr(28)));
    }

    const std::uint16_t portmapperPort = static_cast<std::uint16_t>(std::stoi(simulator.resource("portmapper")));
    const std::uint16_t port = askForPort();
};

/// One connection to the core program and one link on it. Times are 30 s where a test does not care.
class Vxi11Client
{
public:
    explicit Vxi11Client(std::uint16_t port, std::string_view device = "inst0") : core(port, "000607AF"), m_port(port)
    {
        const std::string result = core.call("0000000A", "00000001 00000000 00000000" + size(device), device);
        EXPECT_EQ(result.substr(0, 9), "00000000 ");
        link = result.substr(9, 8);
    }

    /// device_write with END: the result.
    std::string write(std::string_view data, std::string_view flags = "00000008")
    {
        return core.call("0000000B", link + "00007530 00000000" + std::string(flags) + size(data), data);
    }
    /// device_read of up to 1 KiB: the result.
    std::string read() { return core.call("0000000C", link + "00000400 00007530 00000000 00000000 00000000"); }
    /// Data of a device_read that must end with END.
    std::string answer()
    {
        core.send("0000000C", link + "00100000 00007530 00000000 00000000 00000000");
        const std::string reply = core.reply();
        EXPECT_EQ(RpcCaller::digits(reply.substr(24, 8)), "00000000 00000004 ");
        return reply.size() < 36 ? std::string{} : reply.substr(36, RpcCaller::number(reply.substr(32)));
    }
    std::string query(std::string_view text)
    {
        EXPECT_EQ(write(text), "00000000 " + size(text) + " ");
        return answer();
    }
    /// A call whose arguments are those of device_readstb, without waiting for locks.
    std::string generic(std::string_view procedure)
    {
        return core.call(procedure, link + "00000000 00000000 00007530");
    }
    std::string statusByte() { return generic("0000000D"); }
    /// device_abort for this link, on a connection of its own.
    std::string abort() { return RpcCaller(m_port, "000607B0").call("00000001", link); }

    static std::string size(std::string_view data)
    {
        std::string text = RpcCaller::digits(RpcCaller::word(static_cast<std::uint32_t>(data.size())));
        text.pop_back();
        return text;
    }

    RpcCaller core;
    std::string link; ///< eight hexadecimal digits

private:
    const std::uint16_t m_port;
};

} // namespace test
