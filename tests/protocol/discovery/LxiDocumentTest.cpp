#include "kyvisa/discovery/LxiDocument.h"

#include <gtest/gtest.h>
#include <string>

using kyvisa::readLxiDocument;

namespace
{

constexpr const char *Document = R"(<?xml version="1.0" encoding="UTF-8"?>
<!-- an instrument -->
<lxi:LXIDevice xmlns:lxi="http://www.lxistandard.org/InstrumentIdentification/1.0"
               xmlns:xsi="http://www.w3.org/2001/XMLSchema-instance">
  <lxi:Manufacturer>Smith &amp; Sons</lxi:Manufacturer>
  <lxi:Model> PSU&#45;&#x33;00 </lxi:Model>
  <lxi:SerialNumber>0042</lxi:SerialNumber>
  <lxi:FirmwareRevision>1.2.3</lxi:FirmwareRevision>
  <lxi:ManufacturerDescription>Power supply</lxi:ManufacturerDescription>
  <lxi:UserDescription/>
  <lxi:ConnectedDevices><lxi:DeviceURI>http://other/</lxi:DeviceURI></lxi:ConnectedDevices>
  <lxi:Interface xsi:type="lxi:NetworkInformation" InterfaceType="LXI">
    <lxi:InstrumentAddressString>TCPIP::10.0.0.9::inst0::INSTR</lxi:InstrumentAddressString>
    <lxi:InstrumentAddressString>TCPIP::10.0.0.9::hislip0::INSTR</lxi:InstrumentAddressString>
    <lxi:Hostname>psu.local</lxi:Hostname>
  </lxi:Interface>
</lxi:LXIDevice>
)";

TEST(LxiDocument, TellsWhatTheInstrumentIs)
{
    const auto document = readLxiDocument(Document);
    ASSERT_TRUE(document.has_value());
    EXPECT_EQ(document->texts.manufacturer, "Smith & Sons");
    EXPECT_EQ(document->texts.model, "PSU-300");
    EXPECT_EQ(document->texts.serialNumber, "0042");
    EXPECT_EQ(document->texts.version, "1.2.3");
    EXPECT_EQ(document->texts.description, "Power supply");
    EXPECT_EQ(document->texts.hostName, "psu.local");
    EXPECT_EQ(document->resources,
              (std::vector<std::string>{"TCPIP::10.0.0.9::inst0::INSTR", "TCPIP::10.0.0.9::hislip0::INSTR"}));
}

TEST(LxiDocument, PrefersWhatTheUserWrote)
{
    const auto document = readLxiDocument("<LXIDevice><ManufacturerDescription>maker's</ManufacturerDescription>"
                                          "<UserDescription>bench 3</UserDescription></LXIDevice>");
    ASSERT_TRUE(document.has_value());
    EXPECT_EQ(document->texts.description, "bench 3");
}

TEST(LxiDocument, TakesWhateverNamespaceAndVersion)
{
    const auto document = readLxiDocument("<LXIDevice xmlns=\"http://lxistandard.org/schemas/InstrumentId/2.17\">"
                                          "<Model>A&lt;B&gt;&quot;&apos;</Model></LXIDevice>");
    ASSERT_TRUE(document.has_value());
    EXPECT_EQ(document->texts.model, "A<B>\"'");
}

TEST(LxiDocument, ReadsCharacterDataAndWideCharacters)
{
    const auto document =
        readLxiDocument("<LXIDevice><Model><![CDATA[A & <B>]]></Model><Manufacturer>M&#xFC;ller &#x1F600;&#8364;"
                        "</Manufacturer></LXIDevice>");
    ASSERT_TRUE(document.has_value());
    EXPECT_EQ(document->texts.model, "A & <B>");
    EXPECT_EQ(document->texts.manufacturer, "M\xC3\xBCller \xF0\x9F\x98\x80\xE2\x82\xAC");
}

TEST(LxiDocument, LeavesUnknownEntitiesAsTheyStand)
{
    const auto document = readLxiDocument("<LXIDevice><Model>&nbsp;&#0;&#xZ;&</Model></LXIDevice>");
    ASSERT_TRUE(document.has_value());
    EXPECT_EQ(document->texts.model, "&nbsp;&#0;&#xZ;&");
}

TEST(LxiDocument, LeavesEntitiesThatAreTooLongAsTheyStand)
{
    const auto document = readLxiDocument("<LXIDevice><Model>&#x0010FFFF;&#00000000000000000065;</Model></LXIDevice>");
    ASSERT_TRUE(document.has_value());
    EXPECT_EQ(document->texts.model, "\xF4\x8F\xBF\xBF&#00000000000000000065;");
}

TEST(LxiDocument, RefusesEverythingElse)
{
    for (const char *text :
         {"", "hello", "<html><body>LXIDevice</body></html>", "<LXIDevice>", "<LXIDevice><Model></LXIDevice></Model>",
          "<!DOCTYPE x [<!ENTITY e \"x\">]><LXIDevice></LXIDevice>", "<LXIDevice></LXIDevice><LXIDevice></LXIDevice>",
          "<LXIDevice", "<LXIDevice><!-- </LXIDevice>", "</LXIDevice>", "<LXIDevice><![CDATA[ </LXIDevice>"})
        EXPECT_FALSE(readLxiDocument(text).has_value()) << text;
    std::string deep = "<LXIDevice>";
    for (int i = 0; i < 10'000; ++i)
        deep += "<a>";
    EXPECT_FALSE(readLxiDocument(deep).has_value());
}

TEST(LxiDocument, SurvivesEveryTruncation)
{
    const std::string whole = Document;
    const std::size_t end = whole.find_last_of('>');
    for (std::size_t size = 0; size <= end; ++size)
        EXPECT_FALSE(readLxiDocument(whole.substr(0, size)).has_value()) << size;
}

} // namespace
