#pragma once

#include <sys/types.h>

#include <cstdint>

namespace bench
{

/// A simulator of its own on free ports, on the same core as the caller; ends with the object.
class BenchSimulator
{
public:
    /// @throws std::runtime_error when the program does not start.
    BenchSimulator();
    ~BenchSimulator();
    BenchSimulator(const BenchSimulator &) = delete;
    BenchSimulator &operator=(const BenchSimulator &) = delete;

    std::uint16_t hislipPort() const { return m_hislip; }
    std::uint16_t socketPort() const { return m_socket; }
    std::uint16_t portmapperPort() const { return m_portmapper; }

private:
    pid_t m_process = -1;
    std::uint16_t m_hislip = 0;
    std::uint16_t m_socket = 0;
    std::uint16_t m_portmapper = 0;
};

} // namespace bench
