#include "simulator/instrument/MassMemory.h"

#include "simulator/instrument/Characters.h"
#include "simulator/instrument/ScpiError.h"

#include <algorithm>
#include <utility>

namespace simulator
{
namespace
{

constexpr char Separator = '\\';

[[noreturn]] void fail(int number, std::string_view path)
{
    throw ScpiError{number, std::string{path}};
}

std::string upper(std::string_view text)
{
    std::string result{text};
    std::transform(result.begin(), result.end(), result.begin(), toUpper);
    return result;
}

bool isName(std::string_view name, bool wildcards)
{
    return name.size() <= MassMemory::MaxName &&
           std::all_of(name.begin(), name.end(), [](char c) { return c >= ' ' && c <= '~'; }) &&
           name.find_first_of(wildcards ? ":\"',;" : ":*?\"',;") == std::string_view::npos;
}

/// `*` stands for any text, `?` for one character. Both in upper case.
bool matches(std::string_view name, std::string_view pattern)
{
    std::size_t at = 0;
    std::size_t in = 0;
    std::size_t star = std::string_view::npos;
    std::size_t retry = 0;
    while (at < name.size()) {
        if (in < pattern.size() && pattern[in] == '*') {
            star = in++;
            retry = at;
        } else if (in < pattern.size() && (pattern[in] == '?' || pattern[in] == name[at])) {
            ++in;
            ++at;
        } else if (star != std::string_view::npos) {
            in = star + 1;
            at = ++retry;
        } else {
            return false;
        }
    }
    return pattern.find_first_not_of('*', in) == std::string_view::npos;
}

template <typename Names>
std::string keyOf(const Names &names)
{
    std::string key;
    for (const std::string &name : names)
        key += (key.empty() ? "" : std::string{Separator}) + upper(name);
    return key;
}

/// What the keys of everything in a directory begin with.
std::string prefixOf(const std::string &directory)
{
    return directory.empty() ? directory : directory + Separator;
}

} // namespace

void MassMemory::checkReadable() const
{
    if (m_media == Media::Missing)
        fail(-252, {});
    if (m_media == Media::Corrupt)
        fail(-253, {});
}

void MassMemory::checkWritable() const
{
    checkReadable();
    if (m_media == Media::Protected)
        fail(-258, {});
}

MassMemory::Names MassMemory::resolve(std::string_view path, bool wildcards) const
{
    constexpr std::string_view Separators = "/\\";
    const std::string_view whole = path;
    if (path.size() > MaxPath)
        fail(-257, whole);
    Names names = m_current;
    if (path.size() >= 2 && path[1] == ':') {
        if (toUpper(path[0]) != 'C')
            fail(-252, whole);
        path.remove_prefix(2);
        names.clear();
    } else if (Separators.find(path.substr(0, 1)) != std::string_view::npos && !path.empty()) {
        names.clear();
    }
    while (!path.empty()) {
        const std::size_t end = std::min(path.find_first_of(Separators), path.size());
        const std::string_view part = path.substr(0, end);
        path.remove_prefix(std::min(end + 1, path.size()));
        if (part.empty() || part == ".")
            continue;
        if (part == "..") {
            if (names.empty())
                fail(-257, whole);
            names.pop_back();
            continue;
        }
        if (!isName(part, wildcards && path.empty()) || names.size() == MaxDepth)
            fail(-257, whole);
        names.emplace_back(part);
    }
    return names;
}

bool MassMemory::isDirectory(const Names &names) const
{
    const auto found = m_nodes.find(keyOf(names));
    return names.empty() || (found != m_nodes.end() && !found->second.content);
}

const MassMemory::Node &MassMemory::file(const Names &names, std::string_view path) const
{
    const auto found = m_nodes.find(keyOf(names));
    if (names.empty() || (found != m_nodes.end() && !found->second.content))
        fail(-257, path);
    if (found == m_nodes.end())
        fail(-256, path);
    return found->second;
}

void MassMemory::checkParent(const Names &names, std::string_view path) const
{
    if (names.empty())
        fail(-257, path);
    if (!isDirectory({names.begin(), names.end() - 1}))
        fail(-256, path);
}

/// Where a copy of @p from to the path @p to goes: into it when it is a directory.
MassMemory::Names MassMemory::destination(const Names &from, std::string_view to) const
{
    Names names = resolve(to);
    if (isDirectory(names))
        names.push_back(m_nodes.at(keyOf(from)).name);
    if (names.size() > MaxDepth)
        fail(-257, to);
    checkParent(names, to);
    return names;
}

void MassMemory::put(const Names &names, std::shared_ptr<const Bytes> content, std::string_view path)
{
    checkParent(names, path);
    std::string key = keyOf(names);
    const auto old = m_nodes.find(key);
    if (old != m_nodes.end() && !old->second.content)
        fail(-257, path);
    const std::uint64_t replaced = old != m_nodes.end() ? old->second.size() : 0;
    if (content->size() > free() + replaced)
        fail(-254, path);
    if (old == m_nodes.end() && m_nodes.size() == MaxEntries)
        fail(-255, path);
    m_used += content->size() - replaced;
    m_nodes.insert_or_assign(std::move(key), Node{names.back(), std::move(content)});
}

void MassMemory::store(std::string_view path, Bytes content)
{
    checkWritable();
    put(resolve(path), std::make_shared<const Bytes>(std::move(content)), path);
}

std::shared_ptr<const Bytes> MassMemory::load(std::string_view path) const
{
    checkReadable();
    return file(resolve(path), path).content;
}

void MassMemory::remove(std::string_view path)
{
    checkWritable();
    const Names names = resolve(path);
    m_used -= file(names, path).size();
    m_nodes.erase(keyOf(names));
}

void MassMemory::copy(std::string_view from, std::string_view to)
{
    checkWritable();
    const Names source = resolve(from);
    const std::shared_ptr<const Bytes> content = file(source, from).content;
    put(destination(source, to), content, to);
}

void MassMemory::move(std::string_view from, std::string_view to)
{
    checkWritable();
    const Names source = resolve(from);
    const std::string sourceKey = keyOf(source);
    if (!isDirectory(source)) {
        const std::shared_ptr<const Bytes> content = file(source, from).content;
        const Names target = destination(source, to);
        if (const auto there = m_nodes.find(keyOf(target)); there != m_nodes.end() && !there->second.content)
            fail(-257, to);
        m_nodes.erase(sourceKey);
        m_used -= content->size();
        put(target, content, to);
        return;
    }
    const std::string inside = prefixOf(sourceKey);
    if (source.empty() || prefixOf(keyOf(m_current)).starts_with(inside))
        throw ScpiError{-250, "directory in use"};
    const Names target = destination(source, to);
    const std::string targetKey = keyOf(target);
    if (prefixOf(targetKey).starts_with(inside) || m_nodes.contains(targetKey))
        fail(-257, to);
    std::vector<Nodes::iterator> moving;
    for (auto node = m_nodes.begin(); node != m_nodes.end(); ++node) {
        if (node->first != sourceKey && !node->first.starts_with(inside))
            continue;
        const auto depth = std::count(node->first.begin(), node->first.end(), Separator);
        if (static_cast<std::size_t>(depth) + 1 + target.size() > MaxDepth + source.size())
            fail(-257, to);
        moving.push_back(node);
    }
    for (const auto node : moving) {
        auto handle = m_nodes.extract(node);
        if (handle.key() == sourceKey)
            handle.mapped().name = target.back();
        handle.key() = targetKey + handle.key().substr(sourceKey.size());
        m_nodes.insert(std::move(handle));
    }
}

void MassMemory::makeDirectory(std::string_view path)
{
    checkWritable();
    const Names names = resolve(path);
    checkParent(names, path);
    if (m_nodes.contains(keyOf(names)))
        fail(-257, path);
    if (m_nodes.size() == MaxEntries)
        fail(-255, path);
    m_nodes.emplace(keyOf(names), Node{names.back(), nullptr});
}

void MassMemory::removeDirectory(std::string_view path)
{
    checkWritable();
    const Names names = resolve(path);
    if (!isDirectory(names))
        fail(-256, path);
    const std::string prefix = prefixOf(keyOf(names));
    if (prefixOf(keyOf(m_current)).starts_with(prefix))
        throw ScpiError{-250, "directory in use"};
    const auto first = m_nodes.lower_bound(prefix);
    if (first != m_nodes.end() && first->first.starts_with(prefix))
        throw ScpiError{-250, "directory not empty"};
    m_nodes.erase(keyOf(names));
}

void MassMemory::changeDirectory(std::string_view path)
{
    checkReadable();
    Names names = path.empty() ? Names{} : resolve(path);
    if (!isDirectory(names))
        fail(-256, path);
    // The names as they were stored, not as they were asked for.
    for (std::size_t depth = 1; depth <= names.size(); ++depth)
        names[depth - 1] =
            m_nodes.at(keyOf(Names(names.begin(), names.begin() + static_cast<std::ptrdiff_t>(depth)))).name;
    m_current = std::move(names);
}

std::string MassMemory::currentDirectory() const
{
    std::string path = "C:";
    for (const std::string &name : m_current)
        path += Separator + name;
    return m_current.empty() ? path + Separator : path;
}

std::vector<MassMemory::Entry> MassMemory::list(std::string_view path) const
{
    checkReadable();
    Names names = resolve(path, true);
    std::string pattern = "*";
    if (!isDirectory(names)) {
        pattern = upper(names.back());
        names.pop_back();
        if (pattern.find_first_of("*?") == std::string::npos || !isDirectory(names))
            fail(-256, path);
    }
    const std::string prefix = prefixOf(keyOf(names));
    std::vector<Entry> entries;
    for (auto node = m_nodes.lower_bound(prefix); node != m_nodes.end() && node->first.starts_with(prefix); ++node) {
        const std::string_view name = std::string_view{node->first}.substr(prefix.size());
        if (name.find(Separator) == std::string_view::npos && matches(name, pattern))
            entries.push_back({node->second.name, node->second.size(), !node->second.content});
    }
    return entries;
}

void MassMemory::forEach(const std::function<void(const std::string &path, std::size_t size)> &visit) const
{
    for (const auto &[key, node] : m_nodes) {
        if (!node.content)
            continue;
        std::string path;
        for (std::size_t end = key.find(Separator); end != std::string::npos; end = key.find(Separator, end + 1))
            path += m_nodes.at(key.substr(0, end)).name + Separator;
        visit(path + node.name, node.size());
    }
}

void MassMemory::checkDrive(std::string_view drive) const
{
    checkReadable();
    while (drive.size() > 2 && (drive.back() == '\\' || drive.back() == '/'))
        drive.remove_suffix(1);
    if (!drive.empty() && upper(drive) != "C:")
        fail(-252, drive);
}

} // namespace simulator
