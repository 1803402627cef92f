#include "kyvisa/core/Configuration.h"

#include "kyvisa/os/File.h"

#include <algorithm>
#include <charconv>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <ini.h>
#include <optional>
#include <span>
#include <system_error>
#include <utility>

namespace kyvisa
{
namespace
{

/// More of one kind than anybody has.
constexpr std::size_t MostEntries = 4096;

constexpr std::array<std::string_view, 4> ListSections = {"KYVXI11-RSRCS", "SOCKET-RSRCS", "HISLIP-RSRCS",
                                                          "KYGPIB-RSRCS"};

char lower(char c)
{
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

bool equalIgnoringCase(std::string_view a, std::string_view b)
{
    return std::equal(a.begin(), a.end(), b.begin(), b.end(), [](char x, char y) { return lower(x) == lower(y); });
}

/// The number behind @p prefix, for keys like Name0.
std::optional<unsigned> numberedKey(std::string_view key, std::string_view prefix)
{
    unsigned number = 0;
    if (key.size() <= prefix.size() || !equalIgnoringCase(key.substr(0, prefix.size()), prefix))
        return std::nullopt;
    key.remove_prefix(prefix.size());
    const auto [end, error] = std::from_chars(key.data(), key.data() + key.size(), number);
    return error == std::errc() && end == key.data() + key.size() ? std::optional(number) : std::nullopt;
}

/// Without the double quotes, and what is escaped between them.
std::string plainValue(std::string_view value)
{
    if (value.size() < 2 || value.front() != '"' || value.back() != '"')
        return std::string(value);
    value = value.substr(1, value.size() - 2);
    std::string plain;
    for (std::size_t i = 0; i < value.size(); ++i) {
        if (value[i] == '\\' && i + 1 < value.size())
            ++i;
        plain += value[i];
    }
    return plain;
}

Configuration::Alias aliasOf(std::string_view value)
{
    constexpr std::string_view Separator = "','";
    const std::size_t at = value.find(Separator);
    std::string name(value.substr(0, at));
    std::string resource(at == value.npos ? std::string_view() : value.substr(at + Separator.size()));
    std::erase(name, '\'');
    std::erase(resource, '\'');
    return {name, resource};
}

/**
 * Hands the text to the INI library line by line and watches what comes of each. Leading blanks are taken off: to the library
 * an indented line is the continuation of the one before. A line that is too long for it is one that it would tear apart.
 */
class Lines
{
public:
    Lines(std::string_view text, std::vector<int> &damaged) : m_rest(text), m_damaged(damaged) {}

    static char *next(char *buffer, int size, void *self)
    {
        return static_cast<Lines *>(self)->next(buffer, static_cast<std::size_t>(size));
    }
    static int take(void *self, const char *section, const char *key, const char *value)
    {
        static_cast<Lines *>(self)->take(section, key, value);
        return 1;
    }
    Configuration result();

private:
    struct Entry {
        unsigned number;
        std::string value;
    };
    using Entries = std::vector<Entry>;

    char *next(char *buffer, std::size_t size);
    void take(std::string_view section, std::string_view key, std::string_view value);
    void settle();
    static void keep(Entries &entries, std::optional<unsigned> number, std::string value);
    static std::vector<std::string> sorted(Entries &entries);

    std::string_view m_rest;
    std::vector<int> &m_damaged;
    int m_number = 0;
    bool m_wantsResult = false; ///< the line that the library has now should give a key and a value

    bool m_debug = false;
    std::array<Entries, ListSections.size()> m_resources;
    Entries m_aliases;
    Entries m_gateways;
};

/// What the last line has come to.
void Lines::settle()
{
    if (std::exchange(m_wantsResult, false))
        m_damaged.push_back(m_number);
}

char *Lines::next(char *buffer, std::size_t size)
{
    for (;;) {
        settle();
        if (m_rest.empty())
            return nullptr;
        ++m_number;
        const std::size_t end = std::min(m_rest.find('\n'), m_rest.size());
        std::string_view line = m_rest.substr(0, end);
        m_rest.remove_prefix(std::min(end + 1, m_rest.size()));
        line.remove_prefix(std::min(line.find_first_not_of(" \t\r\xEF\xBB\xBF"), line.size()));
        if (line.empty() || line.front() == ';' || line.front() == '#')
            continue;
        const bool fits = line.size() + 2 <= size && line.find('\0') == line.npos;
        m_wantsResult = !fits || line.front() != '[' || line.find(']') == line.npos;
        if (!fits)
            continue;
        std::copy(line.begin(), line.end(), buffer);
        buffer[line.size()] = '\n';
        buffer[line.size() + 1] = '\0';
        return buffer;
    }
}

void Lines::keep(Entries &entries, std::optional<unsigned> number, std::string value)
{
    if (number && !value.empty() && entries.size() < MostEntries)
        entries.push_back({*number, std::move(value)});
}

void Lines::take(std::string_view section, std::string_view key, std::string_view value)
{
    m_wantsResult = false;
    std::string plain = plainValue(value);
    if (equalIgnoringCase(section, "KYVISA") && equalIgnoringCase(key, "Debug"))
        m_debug = plain == "1" || equalIgnoringCase(plain, "true");
    else if (equalIgnoringCase(section, "ALIASES"))
        keep(m_aliases, numberedKey(key, "Alias"), std::move(plain));
    else if (equalIgnoringCase(section, "KYGPIB-GATEWAYS"))
        keep(m_gateways, numberedKey(key, "Board"), std::move(plain));
    else
        for (std::size_t i = 0; i < ListSections.size(); ++i)
            if (equalIgnoringCase(section, ListSections[i]))
                keep(m_resources[i], numberedKey(key, "Name"), plain);
}

std::vector<std::string> Lines::sorted(Entries &entries)
{
    std::stable_sort(entries.begin(), entries.end(),
                     [](const Entry &a, const Entry &b) { return a.number < b.number; });
    std::vector<std::string> values;
    values.reserve(entries.size());
    for (Entry &entry : entries)
        values.push_back(std::move(entry.value));
    return values;
}

Configuration Lines::result()
{
    Configuration configuration;
    configuration.debug = m_debug;
    for (std::size_t i = 0; i < m_resources.size(); ++i)
        configuration.resources[i] = sorted(m_resources[i]);
    for (const Entry &entry : m_gateways)
        if (entry.number <= UINT16_MAX)
            configuration.gateways[static_cast<ViUInt16>(entry.number)] = entry.value;
    for (const std::string &value : sorted(m_aliases))
        if (Configuration::Alias alias = aliasOf(value); !alias.name.empty() && !alias.resource.empty())
            configuration.aliases.push_back(std::move(alias));
    return configuration;
}

std::string environment(const char *name)
{
    const char *value = std::getenv(name);
    return value ? value : "";
}

std::vector<std::string> places()
{
    std::vector<std::string> files;
    if (const std::string file = environment("KYVISA_CONFIG"); !file.empty())
        files.push_back(file);
    std::string home = environment("XDG_CONFIG_HOME");
    if (home.empty() && !environment("HOME").empty())
        home = environment("HOME") + "/.config";
    if (!home.empty())
        files.push_back(home + "/Oltrava/kyvisa.ini");
    files.push_back("/etc/kyvisa.ini");
    return files;
}

bool readFile(const std::string &name, std::string &text)
{
    os::File file(name.c_str(), os::File::Use::Read);
    if (!file.isOpen())
        return false;
    text.resize(LongestConfiguration);
    std::size_t count = 0;
    const bool readable = file.read(std::as_writable_bytes(std::span(text)), count);
    text.resize(count);
    return readable;
}

} // namespace

const std::string *Configuration::resourceOf(std::string_view alias) const
{
    const auto found = std::find_if(aliases.begin(), aliases.end(),
                                    [&](const Alias &known) { return equalIgnoringCase(known.name, alias); });
    return found == aliases.end() ? nullptr : &found->resource;
}

Configuration parseConfiguration(std::string_view text, std::vector<int> &damaged)
{
    damaged.clear();
    Lines lines(text.substr(0, LongestConfiguration), damaged);
    ini_parse_stream(Lines::next, &lines, Lines::take, &lines);
    return lines.result();
}

Configuration readConfiguration()
{
    for (const std::string &name : places()) {
        std::string text;
        std::error_code unknown;
        if (!std::filesystem::is_regular_file(name, unknown) || !readFile(name, text))
            continue;
        std::vector<int> damaged;
        Configuration configuration = parseConfiguration(text, damaged);
        if (configuration.debug)
            for (const int line : damaged)
                std::fprintf(stderr, "kyvisa: %s:%d: this line makes no sense and is skipped\n", name.c_str(), line);
        return configuration;
    }
    return {};
}

} // namespace kyvisa
