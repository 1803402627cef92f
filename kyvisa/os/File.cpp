#include "kyvisa/os/File.h"

namespace kyvisa::os
{
namespace
{

const char *modeOf(File::Use use)
{
    switch (use) {
    case File::Use::Read:
        return "rbe";
    case File::Use::Append:
        return "abe";
    case File::Use::Replace:
        break;
    }
    return "wbe";
}

} // namespace

File::File(const char *name, Use use) : m_file(std::fopen(name, modeOf(use)))
{
    if (m_file)
        std::setvbuf(m_file.get(), nullptr, _IONBF, 0);
}

bool File::write(std::span<const std::byte> data)
{
    return std::fwrite(data.data(), 1, data.size(), m_file.get()) == data.size();
}

bool File::read(std::span<std::byte> data, std::size_t &count)
{
    count = std::fread(data.data(), 1, data.size(), m_file.get());
    return std::ferror(m_file.get()) == 0;
}

bool File::close()
{
    std::FILE *const file = m_file.release();
    return !file || std::fclose(file) == 0;
}

} // namespace kyvisa::os
