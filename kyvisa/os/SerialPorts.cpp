#include "kyvisa/os/SerialPorts.h"

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <map>
#include <tuple>

namespace kyvisa::os
{
namespace
{

namespace fs = std::filesystem;

/// The driver of the classic ports makes several, whether they exist or not. Those that do not are of type 0.
bool isReal(const fs::path &port)
{
    std::error_code error;
    if (!fs::exists(port / "device" / "driver", error))
        return false;
    std::ifstream file(port / "type");
    int type = 0;
    return !(file >> type) || type != 0;
}

/// Device file to its stable name.
std::map<std::string, std::string> stableNames(const std::string &root)
{
    std::map<std::string, std::string> names;
    std::error_code error;
    for (fs::directory_iterator entry(root + "/dev/serial/by-id", error), end; !error && entry != end;
         entry.increment(error)) {
        std::error_code broken;
        const fs::path target = fs::read_symlink(entry->path(), broken);
        if (broken)
            continue;
        const std::string name = entry->path().filename().string();
        std::string &kept = names.try_emplace(target.filename().string(), name).first->second;
        kept = std::min(kept, name); // the folder's own order is none
    }
    return names;
}

/// Orders "ttyS2" before "ttyS10".
std::tuple<bool, std::string, std::string, int> placeOf(const std::string &name,
                                                        const std::map<std::string, std::string> &stable)
{
    const auto known = stable.find(name);
    const std::size_t digits = name.find_last_not_of("0123456789") + 1;
    const std::string letters = name.substr(0, digits);
    const int number = std::atoi(name.c_str() + digits);
    return {known != stable.end(), known != stable.end() ? known->second : std::string(), letters, number};
}

} // namespace

std::vector<std::string> serialPorts(const std::string &root)
{
    std::vector<std::string> names;
    std::error_code error;
    for (fs::directory_iterator entry(root + "/sys/class/tty", error), end; !error && entry != end;
         entry.increment(error))
        if (isReal(entry->path()))
            names.push_back(entry->path().filename().string());
    const auto stable = stableNames(root);
    std::sort(names.begin(), names.end(), [&stable](const std::string &a, const std::string &b) {
        return placeOf(a, stable) < placeOf(b, stable);
    });
    for (std::string &name : names)
        name.insert(0, "/dev/");
    return names;
}

} // namespace kyvisa::os
