#include "simulator/profile/ProfileFile.h"

#include "simulator/profile/ProfileReader.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <system_error>
#include <vector>

namespace simulator
{
namespace
{

namespace fs = std::filesystem;

constexpr std::uintmax_t MaxSize = 4 * 1024 * 1024;
constexpr const char *Extension = ".json";

fs::path shippedFolder()
{
    std::error_code error;
    const fs::path program = fs::read_symlink("/proc/self/exe", error);
    return program.parent_path().parent_path() / "share" / "kyvisa" / "profiles";
}

fs::path shipped(const std::string &name)
{
    const fs::path folder = shippedFolder();
    const fs::path file = folder / (name + Extension);
    std::error_code error;
    if (fs::exists(file, error))
        return file;
    std::vector<std::string> names;
    for (const auto &entry : fs::directory_iterator(folder, error))
        if (entry.path().extension() == Extension)
            names.push_back(entry.path().stem().string());
    std::sort(names.begin(), names.end());
    std::string list;
    for (const std::string &each : names)
        list += " " + each;
    throw ProfileFileError("there is no profile \"" + name + "\" in " + folder.string() +
                           (list.empty() ? std::string{} : "; there are" + list));
}

std::string contentOf(const fs::path &file)
{
    std::error_code error;
    const fs::file_status status = fs::status(file, error);
    if (error)
        throw ProfileFileError(file.string() + ": " + error.message());
    // Whatever else it is may have no end, or none to come.
    if (!fs::is_regular_file(status))
        throw ProfileFileError(file.string() + ": not a file");
    if (fs::file_size(file, error) > MaxSize)
        throw ProfileFileError(file.string() + ": larger than " + std::to_string(MaxSize) + " bytes");
    std::ifstream in(file, std::ios::binary);
    std::string content(static_cast<std::size_t>(MaxSize) + 1, '\0');
    in.read(content.data(), static_cast<std::streamsize>(content.size()));
    if (!in.is_open() || in.bad())
        throw ProfileFileError(file.string() + ": " + std::strerror(errno));
    content.resize(static_cast<std::size_t>(in.gcount()));
    return content;
}

} // namespace

Profile loadProfile(const std::string &nameOrPath)
{
    const bool isPath = nameOrPath.find('/') != std::string::npos || nameOrPath.ends_with(Extension);
    const fs::path file = isPath ? fs::path(nameOrPath) : shipped(nameOrPath);
    const std::string content = contentOf(file);
    try {
        return readProfile(content);
    } catch (const ProfileError &error) {
        throw ProfileFileError(file.string() + ":" + std::to_string(error.position.line) + ":" +
                               std::to_string(error.position.column) + ": " + error.what());
    }
}

} // namespace simulator
