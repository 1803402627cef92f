#pragma once

#include "kyvisa/format/Printer.h"
#include "kyvisa/format/Scanner.h"

#include <cstddef>
#include <span>
#include <vector>

namespace kyvisa::format
{

/// The session below: transfers with the attributes that hold for viRead and viWrite, all under one deadline.
class MessageChannel
{
public:
    /// @param end whether END goes with the last byte.
    virtual ViStatus write(std::span<const std::byte> data, bool end) = 0;
    /// Answers as viRead: VI_SUCCESS with END, VI_SUCCESS_TERM_CHAR, VI_SUCCESS_MAX_CNT.
    virtual ViStatus read(std::span<std::byte> data, std::size_t &count) = 0;
    /// False when nothing but the count can end a read, so that asking for more than is sure to come would wait in vain.
    virtual bool readsEnd() const = 0;

protected:
    ~MessageChannel() = default;
};

/**
 * Formatted output on its way to the device. It is sent when an END is due, when it is full (all but the last byte, so
 * that END has a byte to go with), and by flush(). A failed transfer empties it: nobody can tell what has arrived.
 */
class WriteBuffer
{
public:
    static constexpr std::size_t DefaultSize = 4096;

    std::size_t size() const { return m_size; }
    /// Sends what is inside first. @param size at least 1 byte.
    ViStatus resize(std::size_t size, MessageChannel &channel);
    ViStatus append(std::span<const std::byte> data, MessageChannel &channel);
    /// Sends what is inside, with END. Does nothing when it is empty.
    ViStatus flush(MessageChannel &channel);
    void discard() { m_data.clear(); }

private:
    ViStatus send(std::span<const std::byte> data, bool end, MessageChannel &channel);

    std::size_t m_size = DefaultSize;
    std::vector<std::byte> m_data;
};

/**
 * Formatted input that has been read and not yet been asked for. It never holds bytes of two messages: the next one is
 * fetched when the last one is used up and a new operation begins.
 */
class ReadBuffer
{
public:
    static constexpr std::size_t DefaultSize = 4096;

    std::size_t size() const { return m_size; }
    /// Forgets what is inside. @param size at least 1 byte.
    void resize(std::size_t size);
    /// Forgets what is inside, and reads away the rest of a message that has begun.
    ViStatus flush(MessageChannel &channel);
    void discard();

    /// A new operation begins: behind the end of a message comes the next one.
    void begin();
    /// The byte @p ahead of the next one, or InputSource::Nothing.
    int peek(std::size_t ahead, MessageChannel &channel);
    void skip() { ++m_next; }
    std::size_t take(std::span<std::byte> data, MessageChannel &channel);
    /// The failure that ended the last fetch of this operation, or a completion.
    ViStatus status() const { return m_status; }
    /// All bytes up to the message's end have been taken.
    bool atEnd() const { return m_ended && m_next == m_data.size(); }
    /// How the message ended: VI_SUCCESS or VI_SUCCESS_TERM_CHAR.
    ViStatus end() const { return m_end; }

private:
    bool fetch(std::size_t wanted, MessageChannel &channel);
    void note(ViStatus status, std::size_t count);

    std::size_t m_size = DefaultSize;
    std::vector<std::byte> m_data;
    std::size_t m_next = 0;
    bool m_ended = false; ///< the last byte of m_data is the last of its message
    bool m_begun = false; ///< some of a message has come and its end has not
    ViStatus m_status = 0;
    ViStatus m_end = 0;
};

/// The formatted I/O of one session. One thread at a time.
class FormattedBuffers
{
public:
    WriteBuffer output;
    ReadBuffer input;

    /// @param flushAlways VI_ATTR_WR_BUF_OPER_MODE is VI_FLUSH_ON_ACCESS.
    ViStatus print(const Directives &directives, Arguments &arguments, bool flushAlways, MessageChannel &channel);
    /// @param flushAlways VI_ATTR_RD_BUF_OPER_MODE is VI_FLUSH_ON_ACCESS.
    ViStatus scan(const Directives &directives, Arguments &arguments, bool flushAlways, MessageChannel &channel);
    /// viBufRead: as viRead, through the buffer.
    ViStatus read(std::span<std::byte> data, std::size_t &count, MessageChannel &channel);
};

} // namespace kyvisa::format
