#pragma once

#include <cstddef>
#include <cstdio>
#include <memory>
#include <span>

namespace kyvisa::os
{

/// A regular file for transfers between it and an instrument. Unbuffered: the pieces are large.
class File
{
public:
    enum class Use { Read, Replace, Append };

    /// Check isOpen().
    File(const char *name, Use use);

    bool isOpen() const { return m_file != nullptr; }
    /// @return false when the file took less.
    bool write(std::span<const std::byte> data);
    /// Fills @p data unless the file ends before. @return false when the file cannot be read.
    bool read(std::span<std::byte> data, std::size_t &count);
    /// Closes it. @return false when what was written did not reach the file.
    bool close();

private:
    struct Closer {
        void operator()(std::FILE *file) const { std::fclose(file); }
    };
    std::unique_ptr<std::FILE, Closer> m_file;
};

} // namespace kyvisa::os
