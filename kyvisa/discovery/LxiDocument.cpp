#include "kyvisa/discovery/LxiDocument.h"

#include <algorithm>
#include <charconv>
#include <utility>

namespace kyvisa
{
namespace
{

constexpr std::size_t MostResources = 64;
constexpr std::size_t MostDepth = 64;
constexpr std::size_t LongestEntity = 16; ///< with its "&" and ";"; what is longer is text

void appendUtf8(std::string &text, std::uint32_t code)
{
    if (code < 0x80) {
        text += static_cast<char>(code);
    } else if (code < 0x800) {
        text += static_cast<char>(0xC0 | code >> 6);
        text += static_cast<char>(0x80 | (code & 0x3F));
    } else if (code < 0x10000) {
        text += static_cast<char>(0xE0 | code >> 12);
        text += static_cast<char>(0x80 | (code >> 6 & 0x3F));
        text += static_cast<char>(0x80 | (code & 0x3F));
    } else if (code < 0x110000) {
        text += static_cast<char>(0xF0 | code >> 18);
        text += static_cast<char>(0x80 | (code >> 12 & 0x3F));
        text += static_cast<char>(0x80 | (code >> 6 & 0x3F));
        text += static_cast<char>(0x80 | (code & 0x3F));
    }
}

/// The character that an entity between `&` and `;` stands for, else false.
bool appendEntity(std::string &text, std::string_view entity)
{
    constexpr std::pair<std::string_view, char> Named[] = {
        {"amp", '&'}, {"lt", '<'}, {"gt", '>'}, {"quot", '"'}, {"apos", '\''}};
    for (const auto &[name, character] : Named)
        if (entity == name) {
            text += character;
            return true;
        }
    if (!entity.starts_with('#'))
        return false;
    entity.remove_prefix(1);
    const int base = entity.starts_with('x') ? 16 : 10;
    entity.remove_prefix(base == 16 ? 1 : 0);
    std::uint32_t code = 0;
    const auto [end, error] = std::from_chars(entity.data(), entity.data() + entity.size(), code, base);
    if (error != std::errc() || end != entity.data() + entity.size() || code == 0)
        return false;
    appendUtf8(text, code);
    return true;
}

/// Character data with its entities resolved and the white space around it removed.
std::string plainText(std::string_view raw)
{
    std::string text;
    while (!raw.empty()) {
        const std::size_t ampersand = std::min(raw.find('&'), raw.size());
        text += raw.substr(0, ampersand);
        raw.remove_prefix(ampersand);
        const std::size_t semicolon = raw.substr(0, LongestEntity).find(';');
        if (raw.empty())
            break;
        if (semicolon != raw.npos && appendEntity(text, raw.substr(1, semicolon - 1))) {
            raw.remove_prefix(semicolon + 1);
        } else {
            text += '&';
            raw.remove_prefix(1);
        }
    }
    const std::size_t first = text.find_first_not_of(" \t\r\n");
    return first == text.npos ? std::string() : text.substr(first, text.find_last_not_of(" \t\r\n") + 1 - first);
}

std::string_view localName(std::string_view tag)
{
    const std::string_view name = tag.substr(0, tag.find_first_of(" \t\r\n/"));
    const std::size_t colon = name.find(':');
    return colon == name.npos ? name : name.substr(colon + 1);
}

/// Goes through the document once, from tag to tag.
class DocumentReader
{
public:
    explicit DocumentReader(std::string_view text) : m_rest(text) {}

    std::optional<LxiDocument> read()
    {
        while (m_fine && nextTag()) {
        }
        return m_fine && m_rootSeen && m_open.empty() ? std::optional(std::move(m_document)) : std::nullopt;
    }

private:
    bool nextTag()
    {
        const std::size_t start = m_rest.find('<');
        if (start == m_rest.npos)
            return false;
        m_text += m_rest.substr(0, start);
        m_rest.remove_prefix(start);
        if (skipPast("<!--", "-->") || skipPast("<?", "?>"))
            return true;
        if (m_rest.starts_with("<![CDATA[")) {
            const std::size_t begin = sizeof "<![CDATA[" - 1;
            for (const char c : m_rest.substr(begin, m_rest.find("]]>") - begin))
                m_text += c == '&' ? std::string("&amp;") : std::string(1, c);
            return skipPast("<![CDATA[", "]]>");
        }
        const std::size_t end = m_rest.find('>');
        m_fine = end != m_rest.npos && !m_rest.starts_with("<!"); // a DTD is none of LXI's
        if (!m_fine)
            return false;
        const std::string_view tag = m_rest.substr(1, end - 1);
        m_rest.remove_prefix(end + 1);
        if (tag.starts_with('/')) {
            close(localName(tag.substr(1)));
        } else {
            open(localName(tag));
            if (tag.ends_with('/'))
                close(localName(tag));
        }
        return true;
    }

    bool skipPast(std::string_view begin, std::string_view end)
    {
        if (!m_rest.starts_with(begin))
            return false;
        const std::size_t found = m_rest.find(end, begin.size());
        m_fine = found != m_rest.npos;
        m_rest.remove_prefix(m_fine ? found + end.size() : m_rest.size());
        return true;
    }

    void open(std::string_view name)
    {
        if (m_open.empty())
            m_fine = !std::exchange(m_rootSeen, true) && name == "LXIDevice";
        m_fine = m_fine && m_open.size() < MostDepth;
        m_open.push_back(name);
        m_text.clear();
    }

    void close(std::string_view name)
    {
        m_fine = !m_open.empty() && m_open.back() == name;
        if (!m_fine)
            return;
        m_open.pop_back();
        store(name, plainText(std::exchange(m_text, {})));
    }

    void store(std::string_view name, std::string text)
    {
        LxiTexts &texts = m_document.texts;
        const std::pair<std::string_view, std::string *> wanted[] = {
            {"Manufacturer", &texts.manufacturer},   {"Model", &texts.model},
            {"SerialNumber", &texts.serialNumber},   {"FirmwareRevision", &texts.version},
            {"UserDescription", &texts.description}, {"ManufacturerDescription", &m_otherDescription},
            {"Hostname", &texts.hostName},
        };
        // The first one counts: a gateway may describe what is connected to it further down.
        for (const auto &[element, to] : wanted)
            if (name == element && to->empty())
                *to = text;
        if (name == "InstrumentAddressString" && m_document.resources.size() < MostResources)
            m_document.resources.push_back(std::move(text));
        if (m_open.empty() && texts.description.empty())
            texts.description = m_otherDescription;
    }

    std::string_view m_rest;
    std::string m_text; ///< since the last tag
    std::vector<std::string_view> m_open;
    bool m_rootSeen = false;
    bool m_fine = true;
    std::string m_otherDescription;
    LxiDocument m_document;
};

} // namespace

std::optional<LxiDocument> readLxiDocument(std::string_view text)
{
    return DocumentReader(text).read();
}

} // namespace kyvisa
