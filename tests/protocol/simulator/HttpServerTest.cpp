#include "protocol/simulator/SimulatorFixture.h"

#include <gmock/gmock.h>

using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

namespace test
{
namespace
{

struct Answer {
    std::string head;
    std::string body;
};

class HttpServer : public SimulatorFixture
{
protected:
    HttpServer() : SimulatorFixture({"--hislip", "0", "--socket", "0", "--http", "0"}) {}

    std::uint16_t port() const { return simulator.port("http"); }

    /// Waits for one answer with Content-Length.
    static Answer receive(RawClient &client)
    {
        Answer answer;
        std::size_t length = 0;
        for (std::string line = client.receiveLine(); line != "\r\n" && !line.empty(); line = client.receiveLine()) {
            constexpr std::string_view Field = "Content-Length: ";
            if (line.starts_with(Field))
                length = std::stoul(line.substr(Field.size()));
            answer.head += line;
        }
        answer.body = client.receive(length);
        return answer;
    }

    Answer get(const std::string &path) const
    {
        RawClient client(port());
        client.send("GET " + path + " HTTP/1.1\r\nHost: some.host:8080\r\n\r\n");
        return receive(client);
    }
};

} // namespace

TEST_F(HttpServer, ShowsTheInstrumentToPeople)
{
    ask("SOUR1:VOLT 12.5;:OUTP1 ON;:SIM1:LOAD 50;:MMEM:DATA 'trace.dat',#15hello;:FOO;*OPC?\n");
    const Answer page = get("/");
    EXPECT_THAT(page.head, StartsWith("HTTP/1.1 200 OK\r\n"));
    EXPECT_THAT(page.head, HasSubstr("Content-Type: text/html; charset=utf-8\r\n"));
    EXPECT_THAT(page.head, HasSubstr("Cache-Control: no-store\r\n"));
    EXPECT_THAT(page.body, HasSubstr("<h1>KyVisaSimulator</h1>"));
    EXPECT_THAT(page.body, HasSubstr("<code>" + simulator.resource("hislip") + "</code>"));
    EXPECT_THAT(page.body, HasSubstr("<code>" + simulator.resource("socket") + "</code>"));
    EXPECT_THAT(page.body, HasSubstr("data-name=\"Voltage set\"><span>12.5 V</span>"));
    EXPECT_THAT(page.body, HasSubstr("current limit</span>"));
    EXPECT_THAT(page.body, HasSubstr("data-name=\"Voltage now\"><span>5 V</span></td><td class=\"number\" "
                                     "data-name=\"Current now\"><span>0.1 A</span>"));
    EXPECT_THAT(page.body, HasSubstr("command error</span>"));
    EXPECT_THAT(page.body, HasSubstr("1 waiting</span>"));
    EXPECT_THAT(page.body, HasSubstr("<code>trace.dat</code></td><td class=\"number\">5 B</td>"));
}

TEST_F(HttpServer, ChangesNothingByShowing)
{
    ask("SOUR1:VOLT 12.5;:OUTP1 ON;:FOO;*OPC?\n");
    for (int i = 0; i < 3; ++i)
        get("/");
    get("/state.json");
    EXPECT_EQ(ask("*ESR?\n"), "160\n") << "power on and command error";
    EXPECT_EQ(ask("STAT:QUES?;:SYST:ERR?\n"), "0;-113,\"Undefined header;:FOO\"\n");
    const std::string reading = ask("MEAS1:VOLT?\n");
    SimulatorProcess other({"--socket", "0"});
    RawClient client(other.port("socket"));
    client.send("SOUR1:VOLT 12.5;:OUTP1 ON;:MEAS1:VOLT?\n");
    EXPECT_EQ(client.receiveLine(), reading) << "the noise of the readings went on for nobody";
}

TEST_F(HttpServer, ShowsTheStateToPrograms)
{
    ask("SOUR2:VOLT 3;:OUTP2 ON;*OPC?\n");
    const Answer state = get("/state.json");
    EXPECT_THAT(state.head, HasSubstr("Content-Type: application/json\r\n"));
    EXPECT_THAT(state.body, HasSubstr("\"model\": \"KyVisaSimulator\""));
    EXPECT_THAT(state.body, HasSubstr("\"resource\": \"" + simulator.resource("hislip") + "\""));
    EXPECT_THAT(state.body, HasSubstr("\"presentVoltage\": 3.0"));
}

TEST_F(HttpServer, IdentifiesItselfAsAnLxiDevice)
{
    const Answer document = get("/lxi/identification");
    EXPECT_THAT(document.head, HasSubstr("Content-Type: text/xml; charset=utf-8\r\n"));
    EXPECT_THAT(document.body, StartsWith("<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<LXIDevice "));
    EXPECT_THAT(document.body,
                HasSubstr("<Manufacturer>Oltrava</Manufacturer>\n<Model>KyVisaSimulator</Model>\n"
                          "<SerialNumber>100001</SerialNumber>\n<FirmwareRevision>5.8.6</FirmwareRevision>\n"));
    EXPECT_THAT(document.body, HasSubstr("<HomepageURL>http://some.host:8080/</HomepageURL>"));
    EXPECT_THAT(document.body,
                HasSubstr("<InstrumentAddressString>" + simulator.resource("hislip") + "</InstrumentAddressString>"));
    EXPECT_THAT(document.body, HasSubstr("<IPAddress>127.0.0.1</IPAddress>"));
    EXPECT_THAT(get("/LXI/identification").head, StartsWith("HTTP/1.1 404 ")) << "paths are case-sensitive";
}

TEST_F(HttpServer, IdentifiesItselfToWhoDoesNotNameItsHost)
{
    RawClient client(port());
    client.send("GET /lxi/identification HTTP/1.0\r\n\r\n");
    EXPECT_THAT(client.receiveAll(),
                HasSubstr("<HomepageURL>http://127.0.0.1:" + std::to_string(port()) + "/</HomepageURL>"));
}

TEST_F(HttpServer, KeepsAConnectionForTheNextRequest)
{
    RawClient client(port());
    client.send("GET /nothing HTTP/1.1\r\nHost: a\r\n\r\nHEAD / HTTP/1.1\r\nHost: a\r\n\r\n");
    EXPECT_THAT(receive(client).head, StartsWith("HTTP/1.1 404 Not Found\r\n"));
    std::string head;
    while (!head.ends_with("\r\n\r\n"))
        head += client.receiveLine();
    EXPECT_THAT(head, StartsWith("HTTP/1.1 200 OK\r\n"));
    EXPECT_THAT(head, HasSubstr("Connection: keep-alive\r\n"));
    client.send("GET /icon.svg HTTP/1.1\r\nHost: a\r\nConnection: close\r\n\r\n");
    EXPECT_THAT(client.receiveAll(), StartsWith("HTTP/1.1 200 OK\r\n")) << "HEAD has no body";
}

TEST_F(HttpServer, AnswersAClientThatHasSaidAll)
{
    RawClient client(port());
    client.send("GET / HTTP/1.0\r\n\r\n");
    client.finishSending();
    EXPECT_THAT(client.receiveAll(), StartsWith("HTTP/1.1 200 OK\r\n"));
}

TEST_F(HttpServer, RefusesWhatAPageDoesNotDo)
{
    RawClient client(port());
    client.send("DELETE / HTTP/1.1\r\nHost: a\r\n\r\n");
    const Answer answer = receive(client);
    EXPECT_THAT(answer.head, StartsWith("HTTP/1.1 405 Method Not Allowed\r\n"));
    EXPECT_THAT(answer.head, HasSubstr("Allow: GET, HEAD\r\n"));
}

TEST_F(HttpServer, LetsAClientSendTheBodyItAskedFor)
{
    RawClient client(port());
    client.send("POST / HTTP/1.1\r\nHost: a\r\nContent-Length: 2\r\nExpect: 100-continue\r\n\r\n");
    EXPECT_EQ(client.receive(25), "HTTP/1.1 100 Continue\r\n\r\n");
    client.send("ab");
    EXPECT_THAT(receive(client).head, StartsWith("HTTP/1.1 405 "));
}

TEST_F(HttpServer, ClosesAfterNonsense)
{
    for (const std::string &nonsense : {std::string("*IDN?\n"), std::string("GET /%4 HTTP/1.1\r\n"),
                                        std::string(100'000, '\0'), "GET /" + std::string(100'000, 'a')}) {
        RawClient client(port());
        client.trySend(nonsense);
        const std::string answer = client.receiveAll();
        EXPECT_THAT(answer, StartsWith("HTTP/1.1 4")) << nonsense.substr(0, 40);
        EXPECT_THAT(answer, HasSubstr("Connection: close\r\n"));
    }
    EXPECT_THAT(get("/").head, StartsWith("HTTP/1.1 200 "));
}

TEST_F(HttpServer, WritesTextsSoThatTheyStayTexts)
{
    ask("MMEM:DATA '<b>&.dat',#11x;*OPC?\n");
    const std::string page = get("/").body;
    EXPECT_THAT(page, HasSubstr("<code>&lt;b&gt;&amp;.dat</code>"));
    RawClient client(port());
    client.send("GET /lxi/identification HTTP/1.1\r\nHost: <b>&\r\n\r\n");
    EXPECT_THAT(receive(client).body, HasSubstr("<HomepageURL>http://&lt;b&gt;&amp;/</HomepageURL>"));
}

TEST_F(HttpServer, GivesThePlaceOfWhoWaitsLongestToANewClient)
{
    const char *const Request = "GET /icon.svg HTTP/1.1\r\nHost: a\r\n\r\n";
    RawClient lively(port());
    std::vector<RawClient> clients;
    for (int i = 0; i < 63; ++i)
        clients.emplace_back(port());
    lively.send(Request);
    EXPECT_THAT(receive(lively).head, StartsWith("HTTP/1.1 200 "));
    for (int i = 0; i < 10; ++i)
        clients.emplace_back(port());
    for (int i = 0; i < 10; ++i)
        EXPECT_EQ(clients[static_cast<std::size_t>(i)].receiveAll(), "") << i;
    lively.send(Request);
    EXPECT_THAT(receive(lively).head, StartsWith("HTTP/1.1 200 ")) << "who asks now and then stays";
    clients[10].send(Request);
    EXPECT_THAT(receive(clients[10]).head, StartsWith("HTTP/1.1 200 "));
}

TEST_F(HttpServer, NeitherSilenceNorHalfRequestsKeepOthersOut)
{
    for (const char *beginning : {"", "G", "POST /faults/add HTTP/1.1\r\nHost: a\r\nContent-Length: 9\r\n\r\na"}) {
        std::vector<RawClient> clients;
        for (int i = 0; i < 300; ++i) {
            clients.emplace_back(port());
            clients.back().trySend(beginning);
        }
        EXPECT_THAT(get("/icon.svg").head, StartsWith("HTTP/1.1 200 ")) << beginning;
    }
}

} // namespace test
