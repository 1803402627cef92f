#include "config/ConfigTemplate.h"

QString configTemplate(const QString &path)
{
    const QString ruler = QString(79, QLatin1Char(';')) + QLatin1Char('\n');
    const QString rule = QLatin1Char(';') + QString(78, QLatin1Char('-')) + QLatin1Char('\n');
    const auto text = [](const char *lines) { return QString::fromLatin1(lines); };

    return ruler +
           text(";;\n"
                ";@file         ") +
           path +
           text("\n"
                ";@copyright    (c) Oltrava\n"
                ";;\n"
                ";@language     INI file\n"
                ";;\n"
                ";@description  configuration file for the VISA Library\n"
                ";;             part of Ky VISA\n"
                ";;\n"
                ";@see          https://www.ivifoundation.org/specifications/\n"
                ";;\n") +
           ruler + QLatin1Char('\n') + rule +
           text("; KYVISA\n"
                "; Debug = 0 means that no debug output is done\n"
                "; Debug = 1 means that all VISA calls are traced with std::err\n") +
           rule +
           text("[KYVISA]\n"
                "Debug = 0\n"
                "\n") +
           rule +
           text("; KYVXI11-RSRCS\n"
                "; this section defines all VXI-11 resources that can be found with viFindRsrc(..)\n"
                "; example:\n"
                ";  Name0 = \"TCPIP::localhost::inst0::INSTR\"\n"
                ";  Name1 = \"TCPIP::192.169.0.1::INSTR\"\n"
                ";  NumOfResources = 2\n") +
           rule +
           text("[KYVXI11-RSRCS]\n"
                ";Name0 = \"TCPIP::localhost::inst0::INSTR\"\n"
                ";NumOfResources = 1\n"
                "\n") +
           rule +
           text("; SOCKET-RSRCS\n"
                "; this section defines all raw socket resources that can be found with viFindRsrc(..)\n"
                "; example:\n"
                ";  Name0 = \"TCPIP::localhost::13217::SOCKET\"\n"
                ";  NumOfResources = 1\n") +
           rule +
           text("[SOCKET-RSRCS]\n"
                ";Name0 = \"TCPIP::localhost::13217::SOCKET\"\n"
                ";NumOfResources = 1\n"
                "\n") +
           rule +
           text("; HISLIP-RSRCS\n"
                "; this section defines all HiSLIP resources that can be found with viFindRsrc(..)\n"
                "; example:\n"
                ";  Name0 = \"TCPIP::localhost::hislip0\"\n"
                ";  Name1 = \"TCPIP::localhost::hislip2::INSTR\"\n"
                ";  Name2 = \"TCPIP::localhost::hislip2,13218::INSTR\"\n"
                ";  NumOfResources = 3\n") +
           rule +
           text("[HISLIP-RSRCS]\n"
                ";Name0 = \"TCPIP::localhost::hislip0\"\n"
                ";NumOfResources = 1\n"
                "\n") +
           rule +
           text("; KYIB-RSRCS\n"
                "; this section defines all KYIB resources that can be found with viFindRsrc(..)\n"
                "; example:\n"
                ";  Name0 = \"KYIB::localhost::INSTR\"\n"
                ";  NumOfResources = 1\n") +
           rule +
           text("[KYIB-RSRCS]\n"
                ";Name0 = \"KYIB::localhost::INSTR\"\n"
                ";NumOfResources = 1\n"
                "\n") +
           rule +
           text("; ALIASES\n"
                "; this section defines aliases for VISA resource strings\n"
                "; example:\n"
                "; Alias0 = \"'local','TCPIP::localhost::inst0::INSTR'\"\n"
                "; NumAliases = 1\n") +
           rule +
           text("[ALIASES]\n"
                "NumAliases = 0\n"
                "\n");
}
