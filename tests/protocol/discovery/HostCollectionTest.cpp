#include "kyvisa/discovery/HostCollection.h"

#include <gtest/gtest.h>

using namespace kyvisa;

namespace
{

std::vector<std::string> names(const FoundHosts &hosts)
{
    std::vector<std::string> result;
    for (const FoundResource &resource : resourcesOf(hosts))
        result.push_back(resource.name);
    return result;
}

using Names = std::vector<std::string>;

TEST(HostCollection, OrdersByAddressInNumbersThenByProtocol)
{
    FoundHosts hosts;
    hosts["10.0.0.10"].vxi11Device = "inst0";
    FoundHost &whole = hosts["10.0.0.9"];
    whole.hislipPort = 4880;
    whole.vxi11Device = "inst0";
    whole.socketPort = 5025;
    hosts["9.0.0.1"].hislipPort = 4881;
    hosts["10.0.0.11"].vxi11Device = "gpib0";
    EXPECT_EQ(names(hosts), (Names{"TCPIP0::9.0.0.1::hislip0,4881::INSTR", "TCPIP0::10.0.0.9::hislip0::INSTR",
                                   "TCPIP0::10.0.0.9::inst0::INSTR", "TCPIP0::10.0.0.9::5025::SOCKET",
                                   "TCPIP0::10.0.0.10::inst0::INSTR", "TCPIP0::10.0.0.11::gpib0::INSTR"}));
}

TEST(HostCollection, LeavesOutHostsThatLeadToNothing)
{
    FoundHosts hosts;
    hosts["10.0.0.1"].vxi11Asked = true;
    EXPECT_EQ(names(hosts), Names{});
}

TEST(HostCollection, AddsWhatTheDocumentListsForThisHost)
{
    FoundHosts hosts;
    FoundHost &host = hosts["10.0.0.1"];
    host.vxi11Device = "inst0";
    host.document.resources = {"TCPIP::10.0.0.1::INST0::INSTR", "tcpip::10.0.0.1::hislip1::INSTR",
                               "TCPIP::other::INSTR", "GPIB::3", "rubbish"};
    EXPECT_EQ(names(hosts), (Names{"TCPIP0::10.0.0.1::hislip1::INSTR", "TCPIP0::10.0.0.1::inst0::INSTR"}));
}

TEST(HostCollection, PrefersWhatTheHostAnnounced)
{
    FoundHosts hosts;
    FoundHost &host = hosts["10.0.0.1"];
    host.socketPort = 5025;
    host.announced = {.manufacturer = "announced",
                      .model = "",
                      .serialNumber = "",
                      .version = "",
                      .description = "",
                      .hostName = "a.local."};
    host.document.texts = {.manufacturer = "documented",
                           .model = "M",
                           .serialNumber = "1",
                           .version = "2",
                           .description = "d",
                           .hostName = "b"};
    const LxiTexts texts = resourcesOf(hosts).at(0).texts;
    EXPECT_EQ(texts.manufacturer, "announced");
    EXPECT_EQ(texts.model, "M");
    EXPECT_EQ(texts.description, "d");
    EXPECT_EQ(texts.hostName, "a.local.");
}

TEST(HostCollection, TakesTheAddressWhereNobodyToldAName)
{
    FoundHosts hosts;
    hosts["10.0.0.1"].socketPort = 5025;
    EXPECT_EQ(resourcesOf(hosts).at(0).texts.hostName, "10.0.0.1");
}

} // namespace
