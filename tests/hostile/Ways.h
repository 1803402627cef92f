#pragma once

#include "support/SimulatorProcess.h"

#include <visa.h>

#include <cstdlib>
#include <filesystem>
#include <gtest/gtest.h>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

namespace hostile
{

/// A way to the simulated instrument for tests of the library's C interface.
struct Way {
    const char *name;
    const char *service;
    std::vector<std::string> options;
    bool hasEnd = true; ///< an answer ends by itself
    bool hasServiceRequests = true;
};

/// Keeps the addresses of its members out of the names of the tests.
inline void PrintTo(const Way &way, std::ostream *out)
{
    *out << way.name;
}

inline std::string nameOf(const testing::TestParamInfo<Way> &info)
{
    return info.param.name;
}

inline const std::vector<Way> &ways()
{
    static const std::vector<Way> all = {
        {"socket", "socket", {"--socket", "0"}, false, false},
        {"hislip", "hislip", {"--hislip", "0"}},
        {"overlapped", "hislip", {"--hislip", "0", "--hislip-overlap"}},
        {"vxi11", "vxi11", {"--vxi11", "0", "--portmapper", "0"}},
        {"gateway", "gpib", {"--gpib", "--vxi11", "0", "--portmapper", "0"}},
        {"serial", "serial", {"--serial", "--socket", "0"}, false, false},
    };
    return all;
}

/// The simulator of a way, where the library finds it.
class Instrument
{
public:
    explicit Instrument(const Way &way) : m_simulator(way.options), m_resource(m_simulator.resource(way.service))
    {
        ::setenv("KYVISA_PORTMAPPER_PORT", m_simulator.resource("portmapper").c_str(), 1);
        if (std::string_view(way.service) != "serial")
            return;
        EXPECT_EQ(viOpenDefaultRM(&m_manager), VI_SUCCESS);
        EXPECT_EQ(viOpen(m_manager, m_simulator.resource("socket").c_str(), VI_NULL, 30000, &m_other), VI_SUCCESS);
        viSetAttribute(m_other, VI_ATTR_TMO_VALUE, 30000);
        viSetAttribute(m_other, VI_ATTR_TERMCHAR_EN, VI_TRUE);
        awaitSerialLine(); // so that what the library opens once is open
    }
    ~Instrument() { viClose(m_manager); }
    Instrument(const Instrument &) = delete;
    Instrument &operator=(const Instrument &) = delete;

    const std::string &resource() const { return m_resource; }

    /// Waits until the instrument has seen that its serial line was closed: it makes the line raw again then, also under whoever has
    /// opened it meanwhile. What it answers to the second question it answers after that.
    void awaitSerialLine()
    {
        for (int i = 0; i < 2 && m_other != VI_NULL; ++i) {
            unsigned char answer[16];
            EXPECT_EQ(viWrite(m_other, reinterpret_cast<ViConstBuf>("*OPC?\n"), 6, nullptr), VI_SUCCESS);
            EXPECT_EQ(viRead(m_other, answer, sizeof answer, nullptr), VI_SUCCESS_TERM_CHAR);
        }
    }

private:
    test::SimulatorProcess m_simulator;
    std::string m_resource;
    ViSession m_manager = VI_NULL;
    ViSession m_other = VI_NULL; ///< to the same instrument, where it has a serial line
};

inline std::size_t entries(const char *folder)
{
    const std::filesystem::directory_iterator all(folder);
    return static_cast<std::size_t>(std::distance(begin(all), end(all)));
}

} // namespace hostile
