#include "kyvisa/format/TextBuffers.h"

#include "kyvisa/format/Printer.h"
#include "kyvisa/format/Scanner.h"
#include "kyvisa/include/visa.h"

#include <algorithm>
#include <cstring>

namespace kyvisa::format
{
namespace
{

class TextSink : public OutputSink
{
public:
    explicit TextSink(char *to) : m_next(to) {}

    ViStatus append(std::span<const std::byte> data) override
    {
        std::memcpy(m_next, data.data(), data.size());
        m_next += data.size();
        return VI_SUCCESS;
    }
    ViStatus endLine() override
    {
        *m_next++ = '\n';
        return VI_SUCCESS;
    }
    void terminate() { *m_next = '\0'; }

private:
    char *m_next;
};

class TextSource : public InputSource
{
public:
    explicit TextSource(const char *text) : m_rest(std::as_bytes(std::span(text, std::strlen(text)))) {}

    int peek(std::size_t ahead) override { return ahead < m_rest.size() ? static_cast<int>(m_rest[ahead]) : Nothing; }
    void skip() override { m_rest = m_rest.subspan(1); }
    std::size_t take(std::span<std::byte> data) override
    {
        const auto part = m_rest.first(std::min(data.size(), m_rest.size()));
        std::copy(part.begin(), part.end(), data.begin());
        m_rest = m_rest.subspan(part.size());
        return part.size();
    }
    ViStatus status() const override { return VI_SUCCESS; }

private:
    std::span<const std::byte> m_rest;
};

} // namespace

ViStatus printToText(char *buffer, const char *format, Arguments &arguments)
{
    Directives directives;
    if (const ViStatus status = parseOutputFormat(format, directives); status < VI_SUCCESS)
        return status;
    TextSink sink(buffer);
    const ViStatus status = Printer(arguments, sink).print(directives);
    sink.terminate();
    return status;
}

ViStatus scanText(const char *text, const char *format, Arguments &arguments)
{
    Directives directives;
    if (const ViStatus status = parseInputFormat(format, directives); status < VI_SUCCESS)
        return status;
    TextSource source(text);
    return Scanner(arguments, source).scan(directives);
}

} // namespace kyvisa::format
