#include "bench/VisaClient.h"

#include <cstdio>
#include <cstdlib>

namespace bench
{
namespace
{

void must(ViStatus status, const char *what)
{
    if (status < VI_SUCCESS) {
        std::fprintf(stderr, "%s: 0x%08X\n", what, static_cast<unsigned>(status));
        std::exit(1);
    }
}

} // namespace

std::string resourceOf(const BenchSimulator &simulator, Protocol protocol)
{
    switch (protocol) {
    case Protocol::Socket:
        return "TCPIP::127.0.0.1::" + std::to_string(simulator.socketPort()) + "::SOCKET";
    case Protocol::Hislip:
        return "TCPIP::127.0.0.1::hislip0," + std::to_string(simulator.hislipPort()) + "::INSTR";
    case Protocol::Vxi11:
        break;
    }
    return "TCPIP::127.0.0.1::inst0::INSTR";
}

VisaClient::VisaClient(const std::string &resource, Protocol protocol)
{
    must(viOpenDefaultRM(&m_manager), "viOpenDefaultRM");
    must(viOpen(m_manager, resource.c_str(), VI_NO_LOCK, 2000, &m_session), "viOpen");
    must(viSetAttribute(m_session, VI_ATTR_TMO_VALUE, 30000), "time-out");
    if (protocol == Protocol::Socket)
        terminationCharacter(true);
}

VisaClient::~VisaClient()
{
    viClose(m_manager);
}

ViUInt32 VisaClient::query(char *answer, ViUInt32 size)
{
    ViUInt32 count = 0;
    must(viWrite(m_session, reinterpret_cast<ViConstBuf>("*IDN?\n"), 6, &count), "viWrite");
    must(viRead(m_session, reinterpret_cast<ViPBuf>(answer), size, &count), "viRead");
    return count;
}

void VisaClient::write(const std::string &message)
{
    ViUInt32 count = 0;
    must(
        viWrite(m_session, reinterpret_cast<ViConstBuf>(message.data()), static_cast<ViUInt32>(message.size()), &count),
        "viWrite");
}

void VisaClient::readAll(char *data, ViUInt32 size)
{
    ViUInt32 got = 0;
    while (got < size) {
        ViUInt32 count = 0;
        must(viRead(m_session, reinterpret_cast<ViPBuf>(data + got), size - got, &count), "viRead");
        got += count;
    }
}

void VisaClient::terminationCharacter(bool enabled)
{
    must(viSetAttribute(m_session, VI_ATTR_TERMCHAR_EN, enabled ? VI_TRUE : VI_FALSE), "termination character");
}

} // namespace bench
