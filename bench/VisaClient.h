#pragma once

#include "bench/BenchSimulator.h"

#include <visa.h>

#include <string>

namespace bench
{

enum class Protocol { Socket, Hislip, Vxi11 };

/// The resource that reaches the benchmark's simulator.
std::string resourceOf(const BenchSimulator &simulator, Protocol protocol);

/// A session of libkyvisa. What fails ends the program with a message and status 1: there is nothing to measure then.
class VisaClient
{
public:
    VisaClient(const std::string &resource, Protocol protocol);
    ~VisaClient();
    VisaClient(const VisaClient &) = delete;
    VisaClient &operator=(const VisaClient &) = delete;

    ViUInt32 query(char *answer, ViUInt32 size); ///< *IDN?
    void write(const std::string &message);
    /// Reads exactly @p size bytes.
    void readAll(char *data, ViUInt32 size);
    void terminationCharacter(bool enabled);

private:
    ViSession m_manager = VI_NULL;
    ViSession m_session = VI_NULL;
};

} // namespace bench
