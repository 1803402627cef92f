#pragma once

#include <string>
#include <vector>

class VisaSessionWithLog;

/// What an instrument answered to a short query: the target of every read of at most 4096 bytes.
class Answer
{
public:
    static constexpr unsigned Limit = 4096;

    Answer() : m_bytes(Limit + 1) {}

    /// Reads at most @p limit bytes. Answers how many came. Throws VisaError.
    unsigned read(VisaSessionWithLog &session, unsigned limit = Limit);
    void clear()
    {
        m_count = 0;
        m_bytes[0] = '\0';
    }
    /// The bytes up to the first zero byte.
    const char *text() const { return m_bytes.data(); }
    /// All bytes as log lines show them.
    std::string printable() const;

private:
    std::vector<char> m_bytes; ///< one byte more than asked for: what came is used as text
    unsigned m_count = 0;
};
