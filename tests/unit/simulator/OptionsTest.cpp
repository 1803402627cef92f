#include "simulator/Options.h"

#include "simulator/Services.h"
#include "simulator/profile/Profile.h"

#include <gtest/gtest.h>

#include <unistd.h>

#include <filesystem>
#include <fstream>

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

TEST(SimulatorOptions, SetModeAndLimits)
{
    const Options usual = parse({});
    EXPECT_FALSE(usual.hislipOverlap);
    EXPECT_EQ(usual.maxClients, 64u);
    EXPECT_EQ(usual.handshakeTimeout, 0u);
    EXPECT_EQ(usual.memory, std::nullopt);
    const Options set =
        parse({"--hislip-overlap", "--max-clients", "3", "--handshake-timeout", "7", "--memory", "1000"});
    EXPECT_TRUE(set.hislipOverlap);
    EXPECT_EQ(set.maxClients, 3u);
    EXPECT_EQ(set.handshakeTimeout, 7u);
    EXPECT_EQ(set.memory, 1000u);
    for (const std::vector<const char *> &bad : {std::vector<const char *>{"KyVisaSimulator", "--max-clients", "0"},
                                                 {"KyVisaSimulator", "--max-clients", "101"},
                                                 {"KyVisaSimulator", "--handshake-timeout", "0"},
                                                 {"KyVisaSimulator", "--memory", "-1"},
                                                 {"KyVisaSimulator", "--memory", "much"}}) {
        Options options;
        testing::internal::CaptureStderr();
        EXPECT_EQ(parseOptions(static_cast<int>(bad.size()), bad.data(), options), 2) << bad[1] << ' ' << bad[2];
        EXPECT_NE(testing::internal::GetCapturedStderr().find(bad[1]), std::string::npos);
    }
}

TEST(SimulatorOptions, SetTheSignOfErrors)
{
    EXPECT_FALSE(parse({}).signedErrors);
    EXPECT_TRUE(parse({"--signed-errors"}).signedErrors);
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

TEST(SimulatorOptions, KeepTheDefaultServicesBesideTheWebPage)
{
    const Options options = parse({"--http", "8080"});
    EXPECT_EQ(options.http, 8080);
    EXPECT_EQ(options.hislip, 4880);
    EXPECT_EQ(options.socket, 5025);
    EXPECT_EQ(options.vxi11, 0);
    EXPECT_EQ(parse({"--http", "0", "--socket", "0"}).hislip, std::nullopt);
    EXPECT_EQ(parse({"--mdns"}).hislip, 4880);
    EXPECT_TRUE(parse({"--mdns"}).mdns);
}

TEST(SimulatorOptions, AddVxi11ToTheGateway)
{
    const Options options = parse({"--gpib"});
    EXPECT_TRUE(options.gateway);
    EXPECT_FALSE(options.refuseBusCommands);
    EXPECT_EQ(options.vxi11, 0);
    EXPECT_EQ(options.portmapper, 111);
    EXPECT_TRUE(options.portmapperIsOptional);
    EXPECT_EQ(options.hislip, std::nullopt);
    EXPECT_EQ(parse({"--gpib", "--vxi11", "1024"}).vxi11, 1024);
    EXPECT_TRUE(parse({"--gpib-refuse-docmd"}).gateway);
    EXPECT_FALSE(parse({}).gateway);
}

TEST(SimulatorOptions, ServeTheSerialPortAloneWhenItAloneIsAskedFor)
{
    const Options options = parse({"--serial"});
    EXPECT_TRUE(options.serial);
    EXPECT_EQ(options.hislip, std::nullopt);
    EXPECT_EQ(options.vxi11, std::nullopt);
    EXPECT_FALSE(parse({}).serial);
}

TEST(SimulatorOptions, TakeSeveralAddressesInEitherSpelling)
{
    EXPECT_EQ(addresses(parse({"--listen", "[::1]", "--listen", "127.0.0.2", "--listen", "localhost"})),
              (std::vector<std::string>{"::1", "127.0.0.2", "127.0.0.1"}));
    EXPECT_EQ(addresses(parse({"--listen", "localhost", "--listen", "::1", "--listen", "127.0.0.1"})),
              (std::vector<std::string>{"127.0.0.1", "::1"}))
        << "twice the same is once";
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

TEST(SimulatorOptions, TakeFaultsAndASeed)
{
    const Options options = parse({"--fault", "hislip:cut", "--fault", "any:delay=1:p=0.5", "--seed", "7"});
    ASSERT_EQ(options.faults.size(), 2u);
    EXPECT_EQ(options.faults[0].text, "hislip:cut");
    EXPECT_EQ(options.faults[1].probability, 0.5);
    EXPECT_EQ(options.seed, 7u);
    EXPECT_EQ(parse({}).seed, 1u);
}

TEST(SimulatorOptions, RefuseABadFaultWithItsReason)
{
    const struct {
        std::vector<const char *> words;
        const char *reason;
    } rows[] = {
        {{"KyVisaSimulator", "--fault", "socket:stale-id"},
         "--fault: stale-id makes no sense on socket: its messages carry no id"},
        {{"KyVisaSimulator", "--fault", "nonsense"},
         "--fault: a fault is PROTOCOL:KIND, for example \"hislip:drop-reply:p=0.01\", not \"nonsense\""},
        {{"KyVisaSimulator", "--seed", "-1"}, "--seed"},
        {{"KyVisaSimulator", "--seed", "x"}, "--seed"},
    };
    for (const auto &row : rows) {
        Options options;
        testing::internal::CaptureStderr();
        EXPECT_EQ(parseOptions(static_cast<int>(row.words.size()), row.words.data(), options), 2);
        EXPECT_NE(testing::internal::GetCapturedStderr().find(row.reason), std::string::npos) << row.reason;
    }
    std::vector<const char *> words{"KyVisaSimulator"};
    for (int i = 0; i < 65; ++i)
        words.insert(words.end(), {"--fault", "socket:cut"});
    Options options;
    testing::internal::CaptureStderr();
    EXPECT_EQ(parseOptions(static_cast<int>(words.size()), words.data(), options), 2);
    EXPECT_NE(testing::internal::GetCapturedStderr().find("--fault: at most 64 of them"), std::string::npos);
}

TEST(SimulatorOptions, RefuseADamagedProfileWithItsPlace)
{
    const std::string folder = testing::TempDir() + "kyvisa-profile-" + std::to_string(::getpid());
    std::filesystem::create_directory(folder);
    const std::string file = folder + "/bad.json";
    std::ofstream(file) << "{\n  \"limit\": 1\n}\n";
    std::ofstream(folder + "/good.json") << "{\"limits\": {\"max-message\": 5000}}\n";
    const struct {
        std::string profile;
        std::string reason;
    } rows[] = {
        {file,
         "--profile: " + file +
             ":2:3: a profile has no key \"limit\"; the keys are description identification limits source-measure "
             "settings commands"},
        {folder + "/missing.json", "--profile: " + folder + "/missing.json: No such file or directory"},
        {folder + "/", "--profile: " + folder + "/: not a file"},
        {"/dev/zero", "--profile: /dev/zero: not a file"},
        {"toaster", "--profile: there is no profile \"toaster\" in "},
        {"", "--profile: there is no profile \"\" in "},
    };
    for (const auto &row : rows) {
        const std::vector<const char *> words{"KyVisaSimulator", "--profile", row.profile.c_str()};
        Options options;
        testing::internal::CaptureStderr();
        EXPECT_EQ(parseOptions(static_cast<int>(words.size()), words.data(), options), 2) << row.profile;
        EXPECT_NE(testing::internal::GetCapturedStderr().find(row.reason), std::string::npos) << row.reason;
    }
    EXPECT_EQ(parse({"--profile", (folder + "/good.json").c_str()}).maxMessage, 5000u);
    EXPECT_EQ(parse({"--profile", (folder + "/good.json").c_str(), "--max-message", "6000"}).maxMessage, 6000u);
    std::filesystem::remove_all(folder);
}
