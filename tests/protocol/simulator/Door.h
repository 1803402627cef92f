#pragma once

#include "support/SimulatorProcess.h"

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace test
{

/// A client of the instrument over one of its protocols: what all of them have in common. Every wait ends; what does not come fails the running test.
class Door
{
public:
    virtual ~Door() = default;

    /// Sends a piece of a program message. @p end: it is the last one; END goes with it where the protocol has that.
    virtual void send(std::string_view piece, bool end) = 0;
    /// Waits for a response message. Where there is no END, for as many bytes as it is expected to have.
    virtual std::string receive(std::size_t expectedSize) = 0;

    /// What a raw socket and a serial port do not have.
    virtual bool hasStatus() const { return true; }
    /// An unread answer is interrupted by the next message.
    virtual bool interrupts() const { return true; }
    /// Serial poll.
    virtual unsigned poll() { return 0; }
    virtual void clear() {}
    virtual void trigger() {}

    void command(std::string_view message) { send(message, true); }
    std::string ask(std::string_view message, std::size_t expectedSize)
    {
        send(message, true);
        return receive(expectedSize);
    }
};

/// The ways to the instrument, by name.
const std::vector<std::string> &doorNames();
/// Services that the doors need, for the simulator's command line.
const std::vector<std::string> &doorServices();
std::unique_ptr<Door> openDoor(const std::string &name, const SimulatorProcess &simulator);

} // namespace test
