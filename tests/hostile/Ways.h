#pragma once

#include "support/SimulatorProcess.h"

#include <visa.h>

#include <cstdlib>
#include <filesystem>
#include <gtest/gtest.h>
#include <ostream>
#include <string>
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
        {"serial", "serial", {"--serial"}, false, false},
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
    }
    const std::string &resource() const { return m_resource; }

private:
    test::SimulatorProcess m_simulator;
    std::string m_resource;
};

inline std::size_t entries(const char *folder)
{
    const std::filesystem::directory_iterator all(folder);
    return static_cast<std::size_t>(std::distance(begin(all), end(all)));
}

} // namespace hostile
