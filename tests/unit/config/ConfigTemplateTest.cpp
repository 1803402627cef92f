#include "config/ConfigTemplate.h"

#include <QStringList>

#include <gtest/gtest.h>

namespace
{
const char *const Ruler = ";;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;;";
const char *const Rule = ";------------------------------------------------------------------------------";

const char *const Lines[] = {
    Ruler,
    ";;",
    ";@file         /etc/kyvisa.ini",
    ";@copyright    (c) Oltrava",
    ";;",
    ";@language     INI file",
    ";;",
    ";@description  configuration file for the VISA Library",
    ";;             part of Ky VISA",
    ";;",
    ";@see          https://www.ivifoundation.org/specifications/",
    ";;",
    Ruler,
    "",
    Rule,
    "; KYVISA",
    "; Debug = 0 means that no debug output is done",
    "; Debug = 1 means that all VISA calls are traced with std::err",
    Rule,
    "[KYVISA]",
    "Debug = 0",
    "",
    Rule,
    "; KYVXI11-RSRCS",
    "; this section defines all VXI-11 resources that can be found with viFindRsrc(..)",
    "; example:",
    R"(;  Name0 = "TCPIP::localhost::inst0::INSTR")",
    R"(;  Name1 = "TCPIP::192.169.0.1::INSTR")",
    ";  NumOfResources = 2",
    Rule,
    "[KYVXI11-RSRCS]",
    R"(;Name0 = "TCPIP::localhost::inst0::INSTR")",
    ";NumOfResources = 1",
    "",
    Rule,
    "; SOCKET-RSRCS",
    "; this section defines all raw socket resources that can be found with viFindRsrc(..)",
    "; example:",
    R"(;  Name0 = "TCPIP::localhost::13217::SOCKET")",
    ";  NumOfResources = 1",
    Rule,
    "[SOCKET-RSRCS]",
    R"(;Name0 = "TCPIP::localhost::13217::SOCKET")",
    ";NumOfResources = 1",
    "",
    Rule,
    "; HISLIP-RSRCS",
    "; this section defines all HiSLIP resources that can be found with viFindRsrc(..)",
    "; example:",
    R"(;  Name0 = "TCPIP::localhost::hislip0")",
    R"(;  Name1 = "TCPIP::localhost::hislip2::INSTR")",
    R"(;  Name2 = "TCPIP::localhost::hislip2,13218::INSTR")",
    ";  NumOfResources = 3",
    Rule,
    "[HISLIP-RSRCS]",
    R"(;Name0 = "TCPIP::localhost::hislip0")",
    ";NumOfResources = 1",
    "",
    Rule,
    "; KYIB-RSRCS",
    "; this section defines all KYIB resources that can be found with viFindRsrc(..)",
    "; example:",
    R"(;  Name0 = "KYIB::localhost::INSTR")",
    ";  NumOfResources = 1",
    Rule,
    "[KYIB-RSRCS]",
    R"(;Name0 = "KYIB::localhost::INSTR")",
    ";NumOfResources = 1",
    "",
    Rule,
    "; ALIASES",
    "; this section defines aliases for VISA resource strings",
    "; example:",
    R"(; Alias0 = "'local','TCPIP::localhost::inst0::INSTR'")",
    "; NumAliases = 1",
    Rule,
    "[ALIASES]",
    "NumAliases = 0",
    "",
};
} // namespace

TEST(ConfigTemplate, HasTheseSeventyNineLines)
{
    ASSERT_EQ(std::size(Lines), 79U);
    const QStringList lines = configTemplate("/etc/kyvisa.ini").split('\n');
    ASSERT_EQ(lines.size(), 80);
    for (int i = 0; i < 79; ++i)
        EXPECT_EQ(lines[i].toStdString(), Lines[i]) << "line " << i + 1;
    EXPECT_EQ(lines[79], "") << "behind the last line feed";
}

TEST(ConfigTemplate, NamesThePathAsItIs)
{
    EXPECT_TRUE(configTemplate("/a %1 %2/b").contains("\n;@file         /a %1 %2/b\n"));
}
