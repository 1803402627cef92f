#include "kyvisa/format/FormattedBuffers.h"

#include "kyvisa/include/visa.h"

#include <algorithm>
#include <array>
#include <cstring>

namespace kyvisa::format
{
namespace
{

/// What formatted operations answer for a failed transfer: VPP-4.3 knows a time-out and everything else.
ViStatus transferFailure(ViStatus status)
{
    switch (status) {
    case VI_ERROR_TMO:
    case VI_ERROR_RSRC_LOCKED:
    case VI_ERROR_INV_OBJECT:
    case VI_ERROR_ALLOC:
    case VI_ERROR_ABORT: // the caller's own wish, by viTerminate
        return status;
    default:
        return VI_ERROR_IO;
    }
}

class BufferSink : public OutputSink
{
public:
    BufferSink(WriteBuffer &buffer, MessageChannel &channel) : m_buffer(buffer), m_channel(channel) {}

    ViStatus append(std::span<const std::byte> data) override { return m_buffer.append(data, m_channel); }

    ViStatus endLine() override
    {
        constexpr std::byte LineFeed{'\n'};
        const ViStatus status = m_buffer.append({&LineFeed, 1}, m_channel);
        return status < VI_SUCCESS ? status : m_buffer.flush(m_channel);
    }

private:
    WriteBuffer &m_buffer;
    MessageChannel &m_channel;
};

class BufferSource : public InputSource
{
public:
    BufferSource(ReadBuffer &buffer, MessageChannel &channel) : m_buffer(buffer), m_channel(channel) {}

    int peek(std::size_t ahead) override { return m_buffer.peek(ahead, m_channel); }
    void skip() override { m_buffer.skip(); }
    std::size_t take(std::span<std::byte> data) override { return m_buffer.take(data, m_channel); }
    ViStatus status() const override
    {
        return m_buffer.status() < VI_SUCCESS ? transferFailure(m_buffer.status()) : VI_SUCCESS;
    }

private:
    ReadBuffer &m_buffer;
    MessageChannel &m_channel;
};

} // namespace

ViStatus WriteBuffer::resize(std::size_t size, MessageChannel &channel)
{
    const ViStatus status = flush(channel);
    m_size = size;
    m_data.shrink_to_fit();
    return status;
}

ViStatus WriteBuffer::append(std::span<const std::byte> data, MessageChannel &channel)
{
    if (m_data.size() + data.size() > m_size) {
        // What is inside can go whole, for there is more behind it to carry END.
        if (const ViStatus status = send(m_data, false, channel); status < VI_SUCCESS)
            return status;
        m_data.clear();
        if (data.size() > m_size) {
            if (const ViStatus status = send(data.first(data.size() - 1), false, channel); status < VI_SUCCESS)
                return status;
            data = data.last(1);
        }
    }
    m_data.insert(m_data.end(), data.begin(), data.end());
    return VI_SUCCESS;
}

ViStatus WriteBuffer::flush(MessageChannel &channel)
{
    const ViStatus status = send(m_data, true, channel);
    m_data.clear();
    return status;
}

ViStatus WriteBuffer::send(std::span<const std::byte> data, bool end, MessageChannel &channel)
{
    if (data.empty())
        return VI_SUCCESS;
    const ViStatus status = channel.write(data, end);
    if (status >= VI_SUCCESS)
        return VI_SUCCESS;
    m_data.clear();
    return transferFailure(status);
}

void ReadBuffer::resize(std::size_t size)
{
    discard();
    m_size = size;
    m_data.shrink_to_fit();
}

void ReadBuffer::discard()
{
    m_data.clear();
    m_next = 0;
    m_ended = false;
    m_begun = false;
    m_status = VI_SUCCESS;
}

ViStatus ReadBuffer::flush(MessageChannel &channel)
{
    const bool rest = m_begun && channel.readsEnd();
    discard();
    std::array<std::byte, 4096> dropped;
    for (ViStatus status = rest ? VI_SUCCESS_MAX_CNT : VI_SUCCESS; status == VI_SUCCESS_MAX_CNT;) {
        std::size_t count = 0;
        status = channel.read(dropped, count);
        if (status < VI_SUCCESS)
            return transferFailure(status);
    }
    return VI_SUCCESS;
}

void ReadBuffer::begin()
{
    m_status = VI_SUCCESS;
    if (m_next == m_data.size()) {
        m_data.clear();
        m_next = 0;
        m_ended = false;
    }
}

int ReadBuffer::peek(std::size_t ahead, MessageChannel &channel)
{
    while (m_next + ahead >= m_data.size())
        if (!fetch(m_next + ahead + 1 - m_data.size(), channel))
            return InputSource::Nothing;
    return static_cast<unsigned char>(m_data[m_next + ahead]);
}

std::size_t ReadBuffer::take(std::span<std::byte> data, MessageChannel &channel)
{
    const std::size_t buffered = std::min(data.size(), m_data.size() - m_next);
    std::copy_n(m_data.begin() + static_cast<std::ptrdiff_t>(m_next), buffered, data.begin());
    m_next += buffered;
    std::size_t taken = buffered;
    // The rest goes straight where it is wanted.
    while (taken < data.size() && !m_ended && m_status >= VI_SUCCESS) {
        std::size_t count = 0;
        const ViStatus status = channel.read(data.subspan(taken), count);
        taken += count;
        note(status, count);
    }
    return taken;
}

/// Fetches at least one byte more of the message, unless it has ended.
bool ReadBuffer::fetch(std::size_t wanted, MessageChannel &channel)
{
    if (m_ended || m_status < VI_SUCCESS)
        return false;
    m_data.erase(m_data.begin(), m_data.begin() + static_cast<std::ptrdiff_t>(m_next));
    m_next = 0;
    const std::size_t before = m_data.size();
    const std::size_t room = channel.readsEnd() ? std::max(m_size - std::min(m_size, before), wanted) : wanted;
    m_data.resize(before + room);
    std::size_t count = 0;
    const ViStatus status = channel.read(std::span(m_data).subspan(before), count);
    m_data.resize(before + count);
    if (status < VI_SUCCESS && count == 0)
        m_data.clear();
    note(status, count);
    return count > 0;
}

void ReadBuffer::note(ViStatus status, std::size_t count)
{
    // Bytes that came before a time-out are as good as any.
    m_status = status < VI_SUCCESS && count > 0 ? VI_SUCCESS_MAX_CNT : status;
    m_ended = status == VI_SUCCESS || status == VI_SUCCESS_TERM_CHAR;
    m_begun = !m_ended && status >= VI_SUCCESS;
    if (m_ended)
        m_end = status;
}

ViStatus FormattedBuffers::print(const Directives &directives, Arguments &arguments, bool flushAlways,
                                 MessageChannel &channel)
{
    BufferSink sink(output, channel);
    const ViStatus status = Printer(arguments, sink).print(directives);
    return status >= VI_SUCCESS && flushAlways ? output.flush(channel) : status;
}

ViStatus FormattedBuffers::scan(const Directives &directives, Arguments &arguments, bool flushAlways,
                                MessageChannel &channel)
{
    input.begin();
    BufferSource source(input, channel);
    const ViStatus status = Scanner(arguments, source).scan(directives);
    return status >= VI_SUCCESS && flushAlways ? input.flush(channel) : status;
}

ViStatus FormattedBuffers::read(std::span<std::byte> data, std::size_t &count, MessageChannel &channel)
{
    input.begin();
    count = input.take(data, channel);
    if (input.status() < VI_SUCCESS)
        return input.status();
    if (count == data.size() && !input.atEnd())
        return VI_SUCCESS_MAX_CNT;
    return input.end();
}

} // namespace kyvisa::format
