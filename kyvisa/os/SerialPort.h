#pragma once

#include "kyvisa/os/StreamSocket.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>

namespace kyvisa::os
{

enum class SerialParity : std::uint8_t { None, Odd, Even, Mark, Space };
enum class SerialStop : std::uint8_t { One, OneAndAHalf, Two };

/// How bytes stand on the line.
struct SerialSettings {
    std::uint32_t baud = 9600;
    std::uint8_t dataBits = 8; ///< 5 to 8
    SerialParity parity = SerialParity::None;
    SerialStop stop = SerialStop::One;
    bool xonXoff = false;
    bool rtsCts = false;
    std::uint8_t xon = 0x11;
    std::uint8_t xoff = 0x13;
};

/// A modem line.
enum class SerialLine : std::uint8_t { Dtr, Rts, Cts, Dsr, Dcd, Ri };

/// How often the driver saw an error, since it was loaded.
struct SerialErrors {
    int parity = 0;
    int framing = 0;
    int overrun = 0;
};

/**
 * A serial port, in raw mode and non-blocking underneath. Who has it open has it alone.
 *
 * A byte that arrived with an error comes marked, as termios does with PARMRK: 0xFF 0x00 and the byte; a break is a zero byte
 * with an error; a true 0xFF comes as 0xFF 0xFF. Closing puts back the settings that were found.
 */
class SerialPort
{
public:
    enum class Opened { Done, Absent, Busy, Denied };
    /// What becomes of bytes that were sent and still wait for the line when the port is closed.
    enum class Unsent { Leaves, Discarded };

    SerialPort();
    ~SerialPort();
    SerialPort(SerialPort &&) noexcept;
    SerialPort &operator=(SerialPort &&) = delete;

    Opened open(const std::string &path);
    bool isOpen() const { return m_descriptor >= 0; }
    /// What leaves may take ten seconds; a line that stands still is given up after one.
    void close(Unsent unsent = Unsent::Discarded);
    /// In a forked child: frees the descriptor, changes nothing.
    void abandon();

    /// False when the port cannot do that; its settings are unchanged then.
    bool configure(const SerialSettings &settings);

    /// Takes what is there, and waits when nothing is; count > 0 when Done.
    Transfer receive(std::span<std::byte> buffer, const WaitLimit &limit);
    Transfer receiveNow(std::span<std::byte> buffer);
    Transfer send(std::span<const std::byte> data, const WaitLimit &limit);
    /// Waits until the last bit has left.
    IoResult drain(const WaitLimit &limit);
    /// Holds the line in the break state for a quarter of a second. Nothing when the port cannot do that.
    std::optional<IoResult> sendBreak(const WaitLimit &limit);
    void discardInput();
    void discardOutput();

    std::uint32_t waiting() const;
    /// Nothing where the port has no such line.
    std::optional<bool> line(SerialLine line) const;
    bool setLine(SerialLine line, bool on);
    /// Nothing where the driver does not count.
    std::optional<SerialErrors> errors() const;

private:
    struct Found;

    IoResult waitFor(short events, const WaitLimit &limit) const;
    bool control(unsigned long request, void *argument) const;
    int unsent() const;
    bool letLeave();

    int m_descriptor = -1;
    std::unique_ptr<Found> m_found; ///< the settings before ours
};

} // namespace kyvisa::os
