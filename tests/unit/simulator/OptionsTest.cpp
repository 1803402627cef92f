#include "simulator/Options.h"
#include "simulator/Services.h"

#include <gtest/gtest.h>

#include <sstream>

using namespace simulator;

namespace
{

Options parse(std::vector<const char *> words)
{
    words.insert(words.begin(), "KyVisaSimulator");
    Options options;
    EXPECT_EQ(parseOptions(static_cast<int>(words.size()), words.data(), options), std::nullopt);
    return options;
}

std::vector<std::string> addresses(const Options &options)
{
    std::vector<std::string> result;
    for (const ListenAddress &address : options.listen)
        result.push_back(address.text + (address.optional ? " (optional)" : ""));
    return result;
}

} // namespace

TEST(SimulatorOptions, ServeHislipSocketAndVxi11WhenNothingIsAskedFor)
{
    const Options options = parse({});
    EXPECT_EQ(options.hislip, 4880);
    EXPECT_EQ(options.socket, 5025);
    EXPECT_EQ(options.vxi11, 0);
    EXPECT_EQ(options.portmapper, 111);
    EXPECT_TRUE(options.portmapperIsOptional);
    EXPECT_EQ(options.maxMessage, 1073807360u);
    EXPECT_TRUE(options.reportUnread);
    EXPECT_FALSE(options.quiet);
    EXPECT_EQ(addresses(options), (std::vector<std::string>{"127.0.0.1", "::1 (optional)"}));
}

TEST(SimulatorOptions, ServeNothingElseThanWhatIsAskedFor)
{
    const Options options = parse({"--socket", "0"});
    EXPECT_EQ(options.hislip, std::nullopt);
    EXPECT_EQ(options.socket, 0);
    EXPECT_EQ(options.vxi11, std::nullopt);
    EXPECT_EQ(options.portmapper, std::nullopt);
}

TEST(SimulatorOptions, TakeThePortmapperThatIsAskedForAndNoOther)
{
    const Options options = parse({"--vxi11", "1024", "--portmapper", "1111"});
    EXPECT_EQ(options.vxi11, 1024);
    EXPECT_EQ(options.portmapper, 1111);
    EXPECT_FALSE(options.portmapperIsOptional) << "asked for: not to have it is an error";
    EXPECT_EQ(parse({"--portmapper", "0"}).vxi11, std::nullopt);
}

TEST(SimulatorOptions, AddAPortmapperToVxi11WhereItMayBeHad)
{
    const Options options = parse({"--vxi11", "0"});
    EXPECT_EQ(options.portmapper, 111);
    EXPECT_TRUE(options.portmapperIsOptional);
    EXPECT_EQ(options.socket, std::nullopt);
}

TEST(SimulatorOptions, TakeSeveralAddressesInEitherSpelling)
{
    EXPECT_EQ(addresses(parse({"--listen", "[::1]", "--listen", "127.0.0.2", "--listen", "localhost"})),
              (std::vector<std::string>{"::1", "127.0.0.2", "127.0.0.1"}));
}

TEST(SimulatorOptions, SwitchOffTheReportOfUnreadResponses)
{
    EXPECT_FALSE(parse({"--hislip-ignore-unread"}).reportUnread);
}

TEST(SimulatorServices, SayWhenOtherMachinesCanReachThem)
{
    std::ostringstream notes;
    noteExposure({{"127.0.0.1", false}, {"::1", true}, {"127.8.8.8", false}}, notes);
    EXPECT_EQ(notes.str(), "");
    noteExposure({{"0.0.0.0", false}, {"::1", false}, {"192.168.1.9", false}}, notes);
    EXPECT_EQ(notes.str(), "KyVisaSimulator: listening on 0.0.0.0: other machines can reach this instrument\n"
                           "KyVisaSimulator: listening on 192.168.1.9: other machines can reach this instrument\n");
}
