#include "kyvisa/os/SerialPort.h"

#include "kyvisa/os/Poll.h"
#include "kyvisa/os/SystemCalls.h"

#include <array>
#include <asm/termios.h> // termios2, any baud rate: the C library's header has neither and does not go with this one
#include <cerrno>
#include <chrono>
#include <climits>
#include <linux/serial.h>
#include <sys/file.h>
#include <utility>

namespace kyvisa::os
{
namespace
{

constexpr std::chrono::milliseconds BreakLength{250};
constexpr std::chrono::milliseconds BetweenLooks{2};
/// At the end: for what is on its way, and between two looks whether it moves at all.
constexpr std::chrono::seconds PatienceAtClose{10};
constexpr std::chrono::milliseconds StandstillAtClose{500};

unsigned sizeFlag(std::uint8_t bits)
{
    switch (bits) {
    case 5:
        return CS5;
    case 6:
        return CS6;
    case 7:
        return CS7;
    default:
        return CS8;
    }
}

unsigned parityFlags(SerialParity parity)
{
    switch (parity) {
    case SerialParity::Odd:
        return PARENB | PARODD;
    case SerialParity::Even:
        return PARENB;
    case SerialParity::Mark:
        return PARENB | CMSPAR | PARODD;
    case SerialParity::Space:
        return PARENB | CMSPAR;
    case SerialParity::None:
        break;
    }
    return 0;
}

/// With five data bits "two stop bits" are one and a half on the line, and there is no other way to get those.
bool stopBitsPossible(const SerialSettings &settings)
{
    return (settings.stop == SerialStop::OneAndAHalf) == (settings.dataBits == 5 && settings.stop != SerialStop::One);
}

void fill(termios2 &line, const SerialSettings &settings)
{
    // Without INPCK the system marks no framing errors either.
    line.c_iflag = PARMRK | INPCK | (settings.xonXoff ? IXON | IXOFF : 0);
    line.c_oflag = 0;
    line.c_lflag = 0;
    line.c_cflag = CREAD | CLOCAL | HUPCL | BOTHER | (BOTHER << IBSHIFT) | sizeFlag(settings.dataBits) |
                   parityFlags(settings.parity) | (settings.stop != SerialStop::One ? CSTOPB : 0) |
                   (settings.rtsCts ? CRTSCTS : 0);
    line.c_ispeed = line.c_ospeed = settings.baud;
    line.c_cc[VMIN] = 1;
    line.c_cc[VTIME] = 0;
    line.c_cc[VSTART] = settings.xon;
    line.c_cc[VSTOP] = settings.xoff;
}

/// Drivers take the nearest rate that they can do. Beyond three parts in a hundred nothing would be understood.
bool closeTo(std::uint32_t wanted, std::uint32_t got)
{
    const std::uint64_t difference = wanted > got ? wanted - got : got - wanted;
    return difference * 100 <= std::uint64_t{wanted} * 3;
}

int bitOf(SerialLine line)
{
    switch (line) {
    case SerialLine::Dtr:
        return TIOCM_DTR;
    case SerialLine::Rts:
        return TIOCM_RTS;
    case SerialLine::Cts:
        return TIOCM_CTS;
    case SerialLine::Dsr:
        return TIOCM_DSR;
    case SerialLine::Dcd:
        return TIOCM_CD;
    case SerialLine::Ri:
        break;
    }
    return TIOCM_RI;
}

IoResult failure(int error)
{
    return error == ENOMEM ? IoResult::NoMemory : IoResult::Closed;
}

/// The adapter was pulled out, or the other end of a pseudo terminal has gone.
bool hasGone(int error)
{
    return error == EIO || error == ENXIO || error == ENODEV || error == EBADF;
}

} // namespace

struct SerialPort::Found {
    termios2 settings;
};

SerialPort::SerialPort() = default;

SerialPort::~SerialPort()
{
    close();
}

SerialPort::SerialPort(SerialPort &&other) noexcept
    : m_descriptor(std::exchange(other.m_descriptor, -1)), m_found(std::move(other.m_found))
{
}

bool SerialPort::control(unsigned long request, void *argument) const
{
    return untilNotInterrupted([&] { return systemCalls().ioctl(m_descriptor, request, argument); }) == 0;
}

SerialPort::Opened SerialPort::open(const std::string &path)
{
    m_descriptor = untilNotInterrupted(
        [&] { return systemCalls().open(path.c_str(), O_RDWR | O_NOCTTY | O_NONBLOCK | O_CLOEXEC, 0); });
    if (m_descriptor < 0) {
        if (errno == EBUSY)
            return Opened::Busy;
        return errno == EACCES || errno == EPERM ? Opened::Denied : Opened::Absent;
    }
    auto found = std::make_unique<Found>();
    if (!control(TCGETS2, &found->settings)) {
        abandon();
        return Opened::Absent; // a file, but no port
    }
    // Both: the first keeps out whoever does not ask, the second those to whom the first does not apply (root).
    if (untilNotInterrupted([&] { return systemCalls().flock(m_descriptor, LOCK_EX | LOCK_NB); }) != 0) {
        abandon();
        return Opened::Busy;
    }
    control(TIOCEXCL, nullptr);
    m_found = std::move(found);
    return Opened::Done;
}

/// True when everything has left. A stopped line is given up soon.
bool SerialPort::letLeave()
{
    const Wakeup nobody;
    const Deadline atLast = Deadline::after(PatienceAtClose);
    for (int before = INT_MAX;;) {
        const IoResult result = drain({atLast.orEarlier(Deadline::after(StandstillAtClose)), nobody});
        if (result != IoResult::TimedOut)
            return result == IoResult::Done;
        const int now = unsent();
        if (now >= before || atLast.expired())
            return false;
        before = now;
    }
}

void SerialPort::close(Unsent unsent)
{
    if (!isOpen())
        return;
    if (m_found) {
        const bool allLeft = unsent == Unsent::Leaves && letLeave();
        if (!allLeft)
            control(TCFLSH, reinterpret_cast<void *>(TCOFLUSH)); // or a stopped line would hold the close
        control(TCSETS2, &m_found->settings);
        control(TIOCNXCL, nullptr);
    }
    abandon();
}

void SerialPort::abandon()
{
    if (isOpen())
        systemCalls().close(std::exchange(m_descriptor, -1));
    m_found.reset();
}

bool SerialPort::configure(const SerialSettings &settings)
{
    if (settings.baud == 0 || !stopBitsPossible(settings))
        return false;
    termios2 before{};
    if (!control(TCGETS2, &before))
        return false;
    termios2 wanted = before;
    fill(wanted, settings);
    termios2 got{};
    if (!control(TCSETS2, &wanted) || !control(TCGETS2, &got))
        return false;
    constexpr unsigned Relevant = CSIZE | PARENB | PARODD | CMSPAR | CSTOPB | CRTSCTS;
    if ((got.c_cflag & Relevant) == (wanted.c_cflag & Relevant) && closeTo(settings.baud, got.c_ospeed))
        return true;
    control(TCSETS2, &before);
    return false;
}

IoResult SerialPort::waitFor(short events, const WaitLimit &limit) const
{
    std::array<pollfd, 2> watched = {pollfd{m_descriptor, events, 0}};
    return pollWithin(watched, limit);
}

Transfer SerialPort::receiveNow(std::span<std::byte> buffer)
{
    if (!isOpen())
        return {IoResult::Closed, 0};
    for (;;) {
        const ssize_t got = systemCalls().read(m_descriptor, buffer.data(), buffer.size());
        if (got > 0)
            return {IoResult::Done, static_cast<std::size_t>(got)};
        if (got == 0)
            return {IoResult::Closed, 0}; // the other end of a pseudo terminal, or the adapter, has gone
        if (errno == EINTR)
            continue;
        if (errno == EAGAIN)
            return {IoResult::Done, 0};
        return {failure(errno), 0};
    }
}

Transfer SerialPort::receive(std::span<std::byte> buffer, const WaitLimit &limit)
{
    for (bool first = true;; first = false) {
        if (limit.wakeup.raised())
            return {IoResult::Woken, 0};
        const Transfer got = receiveNow(buffer);
        if (got.result != IoResult::Done || got.count > 0)
            return got;
        // A driver may call itself readable over half a mark that it then keeps.
        if (!first && limit.deadline.expired())
            return {IoResult::TimedOut, 0};
        const IoResult waited = waitFor(POLLIN, limit);
        if (waited != IoResult::Done)
            return {waited, 0};
    }
}

Transfer SerialPort::send(std::span<const std::byte> data, const WaitLimit &limit)
{
    Transfer done;
    if (!isOpen())
        return {IoResult::Closed, 0};
    bool waited = false;
    while (done.count < data.size()) {
        if (limit.wakeup.raised())
            return {IoResult::Woken, done.count};
        const auto rest = data.subspan(done.count);
        const ssize_t sent = systemCalls().write(m_descriptor, rest.data(), rest.size());
        if (sent > 0) {
            done.count += static_cast<std::size_t>(sent);
            if (done.count < data.size() && limit.deadline.expired())
                return {IoResult::TimedOut, done.count};
            continue;
        }
        if (sent < 0 && errno == EINTR)
            continue;
        if (sent < 0 && errno != EAGAIN)
            return {failure(errno), done.count};
        // A driver may call itself writable and then take nothing.
        if (std::exchange(waited, true) && limit.deadline.expired())
            return {IoResult::TimedOut, done.count};
        done.result = waitFor(POLLOUT, limit);
        if (done.result != IoResult::Done)
            return done;
    }
    return done;
}

/// Bytes that wait for the line; -1 when the port does not say.
int SerialPort::unsent() const
{
    int count = 0;
    if (!control(TIOCOUTQ, &count))
        return -1;
    // The chip has a store of its own, and most drivers tell when that is empty too.
    int transmitter = TIOCSER_TEMT;
    control(TIOCSERGETLSR, &transmitter);
    return count == 0 && (transmitter & TIOCSER_TEMT) == 0 ? 1 : count;
}

IoResult SerialPort::drain(const WaitLimit &limit)
{
    // Not tcdrain(): that could not be given a time-out, nor be ended by another thread.
    for (;;) {
        const int left = unsent();
        if (left < 0)
            return failure(errno);
        if (left == 0)
            return IoResult::Done;
        std::array<pollfd, 1> nothing{};
        const IoResult waited = pollWithin(nothing, limit, Deadline::after(BetweenLooks));
        if (waited != IoResult::Done)
            return waited;
    }
}

std::optional<IoResult> SerialPort::sendBreak(const WaitLimit &limit)
{
    if (!isOpen())
        return IoResult::Closed;
    if (!control(TIOCSBRK, nullptr))
        return hasGone(errno) ? std::optional(IoResult::Closed) : std::nullopt;
    std::array<pollfd, 1> nothing{};
    const IoResult waited = pollWithin(nothing, limit, Deadline::after(BreakLength));
    control(TIOCCBRK, nullptr);
    return waited;
}

void SerialPort::discardInput()
{
    control(TCFLSH, reinterpret_cast<void *>(TCIFLUSH));
}

void SerialPort::discardOutput()
{
    control(TCFLSH, reinterpret_cast<void *>(TCOFLUSH));
}

std::uint32_t SerialPort::waiting() const
{
    int count = 0;
    return control(TIOCINQ, &count) && count > 0 ? static_cast<std::uint32_t>(count) : 0;
}

std::optional<bool> SerialPort::line(SerialLine line) const
{
    int lines = 0;
    if (!control(TIOCMGET, &lines))
        return std::nullopt;
    return (lines & bitOf(line)) != 0;
}

bool SerialPort::setLine(SerialLine line, bool on)
{
    int bit = bitOf(line);
    return control(on ? TIOCMBIS : TIOCMBIC, &bit);
}

std::optional<SerialErrors> SerialPort::errors() const
{
    serial_icounter_struct counters{};
    if (!control(TIOCGICOUNT, &counters))
        return std::nullopt;
    return SerialErrors{counters.parity, counters.frame + counters.brk, counters.overrun + counters.buf_overrun};
}

} // namespace kyvisa::os
