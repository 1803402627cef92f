#include "support/ProcessFigures.h"

#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>

namespace test
{
namespace
{

std::size_t lineOf(const std::string &status, const std::string &name)
{
    const std::size_t at = status.find(name + ":");
    return at == std::string::npos ? 0 : std::stoul(status.substr(at + name.size() + 1));
}

std::string contentOf(const std::string &file)
{
    std::ifstream in(file);
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}

} // namespace

ProcessFigures figuresOf(pid_t process)
{
    const std::string folder = "/proc/" + std::to_string(process);
    ProcessFigures figures;
    const std::string status = contentOf(folder + "/status");
    figures.memory = lineOf(status, "VmRSS");
    figures.peakMemory = lineOf(status, "VmHWM");
    std::error_code error;
    for (auto entry = std::filesystem::directory_iterator(folder + "/fd", error);
         !error && entry != std::filesystem::directory_iterator(); entry.increment(error))
        ++figures.descriptors;
    // Behind the name in parentheses: 11 fields, then user and system time.
    std::string stat = contentOf(folder + "/stat");
    std::istringstream fields(stat.erase(0, stat.rfind(')') + 2));
    std::string skipped;
    for (int i = 0; i < 11; ++i)
        fields >> skipped;
    double user = 0;
    double system = 0;
    fields >> user >> system;
    figures.processorSeconds = (user + system) / static_cast<double>(::sysconf(_SC_CLK_TCK));
    return figures;
}

} // namespace test
