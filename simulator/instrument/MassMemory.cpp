#include "simulator/instrument/MassMemory.h"

#include "simulator/instrument/Characters.h"
#include "simulator/instrument/ScpiError.h"

#include <algorithm>

namespace simulator
{
namespace
{

std::string upper(std::string_view text)
{
    std::string result{text};
    std::transform(result.begin(), result.end(), result.begin(), toUpper);
    return result;
}

/// The path without drive and leading separators.
std::string_view withoutRoot(std::string_view path)
{
    if (path.size() >= 2 && path[1] == ':') {
        if (toUpper(path[0]) != 'C')
            throw ScpiError{-252, std::string{path}};
        path.remove_prefix(2);
    }
    while (!path.empty() && (path.front() == '/' || path.front() == '\\'))
        path.remove_prefix(1);
    return path;
}

std::string_view fileName(std::string_view path)
{
    const std::string_view name = withoutRoot(path);
    const bool printable = std::all_of(name.begin(), name.end(), [](char c) { return c >= ' ' && c <= '~'; });
    if (name.empty() || name.size() > MassMemory::MaxName || !printable || name == "." || name == ".." ||
        name.find_first_of("/\\:*?\"',;") != std::string_view::npos)
        throw ScpiError{-257, std::string{path}};
    return name;
}

} // namespace

void MassMemory::store(std::string_view name, Bytes content)
{
    const std::string_view plain = fileName(name);
    const auto old = m_files.find(upper(plain));
    const std::uint64_t replaced = old != m_files.end() ? old->second.content->size() : 0;
    if (content.size() > m_capacity - m_used + replaced)
        throw ScpiError{-254, std::string{plain}};
    if (old == m_files.end() && m_files.size() == MaxFiles)
        throw ScpiError{-255, std::string{plain}};
    m_used += content.size() - replaced;
    m_files.insert_or_assign(upper(plain), File{std::string{plain}, std::make_shared<const Bytes>(std::move(content))});
}

std::shared_ptr<const Bytes> MassMemory::load(std::string_view name) const
{
    const std::string_view plain = fileName(name);
    const auto file = m_files.find(upper(plain));
    if (file == m_files.end())
        throw ScpiError{-256, std::string{plain}};
    return file->second.content;
}

void MassMemory::remove(std::string_view name)
{
    m_used -= load(name)->size();
    m_files.erase(upper(fileName(name)));
}

void MassMemory::checkDirectory(std::string_view directory) const
{
    if (!withoutRoot(directory).empty())
        throw ScpiError{-256, std::string{directory}};
}

void MassMemory::checkDrive(std::string_view drive) const
{
    if (!drive.empty() && (drive.size() < 2 || drive[1] != ':' || !withoutRoot(drive).empty()))
        throw ScpiError{-252, std::string{drive}};
}

void MassMemory::forEach(const std::function<void(const std::string &name, std::size_t size)> &visit) const
{
    for (const auto &[key, file] : m_files)
        visit(file.name, file.content->size());
}

} // namespace simulator
