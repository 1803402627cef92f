#pragma once

#include "kyvisa/core/IoGate.h"
#include "kyvisa/format/FormattedBuffers.h"

#include <atomic>
#include <cstddef>
#include <span>

namespace kyvisa
{

class InstrumentSession;

/**
 * The formatted I/O of one session: its two buffers, used by one thread at a time, on the session's own transfers.
 *
 * The turn here is taken before the session's turn and held for the whole operation, so that the pieces of one message
 * stay together; a plain viRead or viWrite may still come between two pieces.
 */
class FormattedIo
{
public:
    explicit FormattedIo(InstrumentSession &session) : m_session(session) {}

    ViStatus print(const char *text, format::Arguments &arguments);
    ViStatus scan(const char *text, format::Arguments &arguments);
    /// Forgets unread input, prints, sends, scans; the arguments of @p output come first.
    ViStatus query(const char *output, const char *input, format::Arguments &arguments);

    ViStatus write(std::span<const std::byte> data, std::size_t &count);
    ViStatus read(std::span<std::byte> data, std::size_t &count);

    /// @param mask VI_READ_BUF, VI_WRITE_BUF, VI_IO_IN_BUF and VI_IO_OUT_BUF in any combination.
    /// @param size in bytes, 1 to 64 MiB.
    /// @return VI_WARN_NSUP_BUF for another size, and where the system's buffers cannot be set.
    ViStatus setBuffer(ViUInt16 mask, ViUInt32 size);
    /// @return VI_ERROR_INV_MASK for unknown or contradictory bits.
    ViStatus flush(ViUInt16 mask);

    /// The device has been cleared: both buffers are empty from the next operation on. May be called from any thread.
    void forget() { m_forget.store(true); }
    /// Those who wait for their turn leave with VI_ERROR_INV_OBJECT.
    void close() { m_turn.close(); }

private:
    template <typename Work>
    ViStatus inTurn(const Work &work);
    bool flushesOnAccess(ViAttr mode) const;

    InstrumentSession &m_session;
    IoGate m_turn;
    format::FormattedBuffers m_buffers; ///< belongs to whoever has the turn
    std::atomic<bool> m_forget{false};
};

} // namespace kyvisa
