#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <sys/types.h>
#include <vector>

namespace test
{

/// A KyVisaSimulator of its own, on free ports. Ends with the object.
class SimulatorProcess
{
public:
    /// Waits until it says that it is ready. @param options beside those, for example "--hislip 0".
    explicit SimulatorProcess(const std::vector<std::string> &options);
    ~SimulatorProcess();
    SimulatorProcess(const SimulatorProcess &) = delete;
    SimulatorProcess &operator=(const SimulatorProcess &) = delete;

    /// The resource string of a service ("hislip", "socket"); empty when it is not served.
    std::string resource(const std::string &service) const;
    /// Port of a service.
    std::uint16_t port(const std::string &service) const;
    /// Sends the signal and waits. The exit status; 256 and the signal's number when one ended it.
    int stop(int signal);
    pid_t id() const { return m_process; }
    /// Waits for the next line that it prints after "ready"; empty when none comes.
    std::string nextLine();
    /// Whoever reads its output goes.
    void closeOutput();

private:
    void readServices();
    bool readMore();

    pid_t m_process = -1;
    int m_output = -1;
    std::string m_text; ///< read and not used yet
    std::map<std::string, std::string> m_resources;
};

} // namespace test
