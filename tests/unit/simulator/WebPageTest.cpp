#include "unit/simulator/HandTurnedTimers.h"

#include "simulator/instrument/Instrument.h"
#include "simulator/web/InstrumentState.h"
#include "simulator/web/LxiIdentification.h"
#include "simulator/web/Markup.h"
#include "simulator/web/StateJson.h"
#include "simulator/web/StatePage.h"

#include <gmock/gmock.h>

using namespace simulator;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;

namespace
{

/// What the fields of an LXI document hold besides the interfaces.
const char *const Document =
    R"(<?xml version="1.0" encoding="UTF-8"?>
<LXIDevice xmlns="http://www.lxistandard.org/InstrumentIdentification/1.0" xmlns:xsi="http://www.w3.org/2001/XMLSchema-instance" xsi:schemaLocation="http://www.lxistandard.org/InstrumentIdentification/1.0 http://box/lxi/identification">
<Manufacturer>R&amp;D</Manufacturer>
<Model>&lt;One&gt;</Model>
<SerialNumber>&quot;1&#39;</SerialNumber>
<FirmwareRevision>2.0</FirmwareRevision>
<ManufacturerDescription>A simulated instrument for VISA programs</ManufacturerDescription>
<HomepageURL>http://box/</HomepageURL>
<UserDescription>&lt;One&gt; on box</UserDescription>
<IdentificationURL>http://box/lxi/identification</IdentificationURL>
<Interface xsi:type="NetworkInformation" InterfaceType="LXI" IPType="IPv4">
<InstrumentAddressString>TCPIP::10.0.0.7::hislip0,4881::INSTR</InstrumentAddressString>
<InstrumentAddressString>TCPIP::10.0.0.7::inst0::INSTR</InstrumentAddressString>
<Hostname>10.0.0.7</Hostname>
<IPAddress>10.0.0.7</IPAddress>
<DHCPEnabled>false</DHCPEnabled>
<AutoIPEnabled>false</AutoIPEnabled>
</Interface>
<Interface xsi:type="NetworkInformation" InterfaceType="LXI" IPType="IPv6">
<InstrumentAddressString>TCPIP::[fe80::1]::5025::SOCKET</InstrumentAddressString>
<Hostname>fe80::1</Hostname>
<IPAddress>fe80::1</IPAddress>
<DHCPEnabled>false</DHCPEnabled>
<AutoIPEnabled>false</AutoIPEnabled>
</Interface>
<Domain>1</Domain>
<LXIVersion>1.5</LXIVersion>
<LXIExtendedFunctions>
<Function FunctionName="LXI HiSLIP" Version="1.0"><Port>4881</Port>
<Subaddress>hislip0</Subaddress>
</Function>
<Function FunctionName="LXI IPv6" Version="1.0"></Function>
<Function FunctionName="LXI VXI-11" Version="1.0"></Function>
</LXIExtendedFunctions>
</LXIDevice>
)";

} // namespace

TEST(Markup, EscapesWhatIsMarkup)
{
    EXPECT_EQ(markup(R"(a<b>&"c'</b>)"), "a&lt;b&gt;&amp;&quot;c&#39;&lt;/b&gt;");
    EXPECT_EQ(markup(""), "");
    EXPECT_EQ(markup("\t\r\n"), "\t\r\n");
}

TEST(Markup, KeepsCharactersAndReplacesWhatIsNone)
{
    EXPECT_EQ(markup("\u00E4\u20AC\U0001F600"), "\u00E4\u20AC\U0001F600");
    EXPECT_EQ(markup(std::string_view("a\0b", 3)), "a\uFFFDb");
    EXPECT_EQ(markup("\x1B[1m"), "\uFFFD[1m");
    EXPECT_EQ(markup("\x80"), "\uFFFD");
    EXPECT_EQ(markup("\xC3"), "\uFFFD") << "cut off";
    EXPECT_EQ(markup("\xC3<"), "\uFFFD&lt;") << "the next character is not swallowed";
    EXPECT_EQ(markup("\xC0\xBC"), "\uFFFD\uFFFD") << "an overlong '<'";
    EXPECT_EQ(markup("\xE0\x80\xBC"), "\uFFFD\uFFFD\uFFFD");
    EXPECT_EQ(markup("\xED\xA0\x80"), "\uFFFD\uFFFD\uFFFD") << "a surrogate";
    EXPECT_EQ(markup("\xEF\xBF\xBF"), "\uFFFD\uFFFD\uFFFD") << "no character of XML";
    EXPECT_EQ(markup("\xF4\x90\x80\x80"), "\uFFFD\uFFFD\uFFFD\uFFFD") << "beyond the last one";
    EXPECT_EQ(markup("\xF5\x80\x80\x80"), "\uFFFD\uFFFD\uFFFD\uFFFD");
}

TEST(LxiIdentification, NamesTheInstrumentItsAddressesAndFunctions)
{
    const std::vector<ServedAt> services = {{"hislip", "TCPIP::10.0.0.7::hislip0,4881::INSTR"},
                                            {"socket", "TCPIP::[fe80::1]::5025::SOCKET"},
                                            {"vxi11", "TCPIP::10.0.0.7::inst0::INSTR"},
                                            {"serial", "ASRL/dev/pts/3::INSTR"}};
    EXPECT_EQ(lxiIdentification({"R&D", "<One>", "\"1'", "2.0"}, services, "box"), Document);
}

TEST(LxiIdentification, DoesWithoutServices)
{
    const std::string document = lxiIdentification({"a", "b", "c", "d"}, {}, "box");
    EXPECT_THAT(document, Not(HasSubstr("Interface ")));
    EXPECT_THAT(document, Not(HasSubstr("ExtendedFunctions")));
}

TEST(InstrumentState, FindsTheServicesInTheStartLines)
{
    const auto services = servicesIn({"hislip TCPIP::127.0.0.1::hislip0,1::INSTR", "portmapper 127.0.0.1 111",
                                      "http http://127.0.0.1:80/", "socket TCPIP::[::1]::2::SOCKET",
                                      "gpib TCPIP::127.0.0.1::gpib0,5::INSTR"});
    ASSERT_EQ(services.size(), 3u);
    EXPECT_EQ(services[0].service, "hislip");
    EXPECT_EQ(services[0].resource, "TCPIP::127.0.0.1::hislip0,1::INSTR");
    EXPECT_EQ(services[1].resource, "TCPIP::[::1]::2::SOCKET");
    EXPECT_EQ(services[2].service, "gpib");
}

class SeenInstrument : public testing::Test
{
protected:
    HandTurnedTimers timers;
    Instrument instrument{timers, {}};
};

TEST_F(SeenInstrument, HasItsRegistersDecoded)
{
    instrument.report({-113, "FOO"});
    instrument.status.setEventEnable(32);
    instrument.status.setServiceEnable(32);
    instrument.status.operation.enable = 16;
    instrument.status.operation.setCondition(16 | 256);
    instrument.status.operation.setCondition(256);
    const InstrumentState state = stateOf(instrument, {});
    ASSERT_EQ(state.registers.size(), 4u);
    EXPECT_EQ(state.registers[0].value, 4u + 32 + 64 + 128);
    EXPECT_THAT(state.registers[0].bits,
                ElementsAre("error available", "standard event", "master summary", "operation"));
    EXPECT_THAT(state.registers[1].bits, ElementsAre("command error", "power on"));
    EXPECT_THAT(state.registers[2].bits, ElementsAre("bit 256"));
    EXPECT_THAT(state.registers[2].events, ElementsAre("measuring", "bit 256"));
    EXPECT_EQ(state.errors, 1u);
}

TEST_F(SeenInstrument, IsNotChangedByLooking)
{
    instrument.report({-113, {}});
    instrument.status.operation.setCondition(16);
    stateOf(instrument, {});
    EXPECT_EQ(instrument.status.operation.takeEvent(), 16);
    EXPECT_EQ(instrument.status.takeEvent(), 128 + 32);
    EXPECT_EQ(instrument.errors.size(), 1u);
}

TEST_F(SeenInstrument, ShowsABoundedNumberOfFiles)
{
    for (int i = 0; i < 103; ++i)
        instrument.massMemory.store("f" + std::to_string(i), Bytes(instrument.blocks));
    const InstrumentState state = stateOf(instrument, {});
    EXPECT_EQ(state.files.size(), 100u);
    EXPECT_EQ(state.fileCount, 103u);
    EXPECT_THAT(statePage(state), HasSubstr("<td>and 3 more</td>"));
}

TEST_F(SeenInstrument, IsWrittenAsJsonWhateverItsTextsAre)
{
    InstrumentState state = stateOf(instrument, {});
    state.files.push_back({"\"\xFF\\\n", 3});
    EXPECT_THAT(stateJson(state), HasSubstr("\"name\": \"\\\"\uFFFD\\\\\\n\""));
}
