#pragma once

#include <cstddef>
#include <span>

class VisaSessionWithLog;

/// How the end of a binary answer is told on this interface.
enum class BlockEnd {
    Message,              ///< END comes with the last byte
    TerminationChar,      ///< a raw socket: nothing but a character, which the block may hold too
    SerialTerminationChar ///< the same on a serial line, where the end mode says so
};

/**
 * Reads the data of an IEEE 488.2 definite-length block, whose header has been read already, and the line end behind it.
 * The data may hold any byte: where a termination character ends a read, that is switched off meanwhile.
 */
class BlockReader
{
public:
    BlockReader(VisaSessionWithLog &session, BlockEnd end) : m_session(session), m_end(end) {}

    /// Reads @p expected bytes into @p target, which has room for more. Answers how many there are when less or more come
    /// than expected, too. Throws VisaError.
    std::size_t readData(std::span<char> target, std::size_t expected);
    /// Takes the line end where it has not come with the data. Answers the bytes that came although they are none of it.
    std::size_t readLineEnd();

private:
    std::size_t readUntilComplete(std::span<char> target, std::size_t expected);
    void endAtTerminationChar(bool enabled);

    VisaSessionWithLog &m_session;
    BlockEnd m_end;
};
