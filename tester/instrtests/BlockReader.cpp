#include "instrtests/BlockReader.h"

#include "instrtests/Answer.h"
#include "visa/VisaSessionWithLog.h"

#include <visa.h>

#include <string_view>

namespace
{

/// Bytes of the line end that @p text ends with.
std::size_t lineEnd(std::string_view text)
{
    if (text.ends_with("\r\n"))
        return 2;
    return text.ends_with('\n') ? 1 : 0;
}

} // namespace

std::size_t BlockReader::readData(std::span<char> target, std::size_t expected)
{
    if (m_end != BlockEnd::Message) {
        endAtTerminationChar(false);
        return readUntilComplete(target, expected);
    }
    const std::size_t count = m_session.read(target.data(), static_cast<unsigned>(target.size()));
    // The data may end with a line feed of its own: what is expected is never taken for a line end.
    if (count <= expected)
        return count;
    return count - lineEnd(std::string_view(target.data() + expected, count - expected));
}

std::size_t BlockReader::readLineEnd()
{
    if (m_end == BlockEnd::Message)
        return 0;
    endAtTerminationChar(true);
    Answer rest;
    const std::size_t count = rest.read(m_session);
    return count - lineEnd(std::string_view(rest.text(), count));
}

std::size_t BlockReader::readUntilComplete(std::span<char> target, std::size_t expected)
{
    std::size_t count = 0;
    while (count < expected) {
        const unsigned piece = m_session.read(target.data() + count, static_cast<unsigned>(expected - count));
        if (piece == 0)
            break; // an answer without data, and without a failure: no more will come
        count += piece;
    }
    return count;
}

void BlockReader::endAtTerminationChar(bool enabled)
{
    if (m_end == BlockEnd::SerialTerminationChar)
        m_session.setAttribute(VI_ATTR_ASRL_END_IN, enabled ? VI_ASRL_END_TERMCHAR : VI_ASRL_END_NONE, true);
    else
        m_session.setAttribute(VI_ATTR_TERMCHAR_EN, enabled ? VI_TRUE : VI_FALSE, true);
}
