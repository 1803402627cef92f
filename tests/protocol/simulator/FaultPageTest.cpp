#include "protocol/simulator/SimulatorFixture.h"

#include <gmock/gmock.h>

using namespace test;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

namespace
{

/// The faults as a browser sees and changes them.
class FaultPage : public SimulatorFixture
{
protected:
    FaultPage() : SimulatorFixture({"--hislip", "0", "--socket", "0", "--http", "0"}) {}

    std::string talk(const std::string &request)
    {
        RawClient client(simulator.port("http"));
        client.send(request);
        client.finishSending();
        return client.receiveAll();
    }
    std::string get() { return talk("GET /faults HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n\r\n"); }
    std::string post(const std::string &path, const std::string &form)
    {
        return talk("POST /faults/" + path +
                    " HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\nContent-Type: "
                    "application/x-www-form-urlencoded\r\nContent-Length: " +
                    std::to_string(form.size()) + "\r\n\r\n" + form);
    }
};

} // namespace

TEST_F(FaultPage, AddsShowsAndRemovesFaults)
{
    EXPECT_THAT(get(), HasSubstr("None: the instrument behaves."));
    EXPECT_THAT(post("add", "spec=socket%3Adrop-reply%3Anth%3D1"), StartsWith("HTTP/1.1 303 "));
    EXPECT_EQ(ask("*ESE 1;*ESE?\n*ESE 2;*ESE?\n"), "2\n") << "it strikes";
    EXPECT_THAT(get(), HasSubstr("<tr><td class=\"number\">1</td><td><code>socket:drop-reply:nth=1</code></td>"
                                 "<td class=\"number\">2</td><td class=\"number\">1</td>"));
    EXPECT_THAT(post("add", "spec=hislip%3Acut"), StartsWith("HTTP/1.1 303 "));
    EXPECT_EQ(ask("DIAG:FAUL:LIST?\n"), "2,1,\"socket:drop-reply:nth=1\",2,\"hislip:cut\"\n");
    EXPECT_THAT(post("remove", "number=1"), StartsWith("HTTP/1.1 303 "));
    EXPECT_EQ(ask("DIAG:FAUL:LIST?\n"), "1,2,\"hislip:cut\"\n");
    EXPECT_THAT(post("remove", "number=all"), StartsWith("HTTP/1.1 303 "));
    EXPECT_THAT(get(), HasSubstr("None: the instrument behaves."));
}

TEST_F(FaultPage, BeginsAfreshWithASeed)
{
    post("add", "spec=socket%3Adrop-reply%3Anth%3D2");
    ask("*OPC?\n");
    EXPECT_THAT(post("seed", "seed=99"), StartsWith("HTTP/1.1 303 "));
    EXPECT_THAT(get(), HasSubstr("<td class=\"number\">0</td><td class=\"number\">0</td>"));
    EXPECT_THAT(get(), HasSubstr("value=\"99\""));
}

TEST_F(FaultPage, SaysWhatIsWrong)
{
    const std::string answer = post("add", "spec=socket%3Astale-id");
    EXPECT_THAT(answer, StartsWith("HTTP/1.1 400 "));
    EXPECT_THAT(answer, HasSubstr("stale-id makes no sense on socket: its messages carry no id"));
    EXPECT_THAT(post("add", ""), StartsWith("HTTP/1.1 400 "));
    EXPECT_THAT(post("remove", "number=7"), StartsWith("HTTP/1.1 400 "));
    EXPECT_THAT(post("remove", "number=-1"), StartsWith("HTTP/1.1 400 "));
    EXPECT_THAT(post("seed", "seed=soon"), StartsWith("HTTP/1.1 400 "));
    const std::string script = post("add", "spec=%3Cscript%3E%3Aa");
    EXPECT_THAT(script, StartsWith("HTTP/1.1 400 "));
    EXPECT_THAT(script, Not(HasSubstr("<script>:a")));
    EXPECT_EQ(ask("DIAG:FAUL:LIST?\n"), "0\n");
}

TEST_F(FaultPage, ChangesNothingByAGet)
{
    for (const char *path :
         {"/faults/add?spec=socket:cut", "/faults/remove?number=all", "/faults/seed?seed=5", "/faults?spec=socket:cut"})
        talk(std::string("GET ") + path + " HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n\r\n");
    EXPECT_EQ(ask("DIAG:FAUL:LIST?;SEED?\n"), "0;1\n");
}
