#pragma once

#include "simulator/instrument/Bytes.h"

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <string_view>

namespace simulator
{

/**
 * The instrument's mass memory: files of one directory on one drive, "C:", in the simulator's memory. It takes over a block without copying it, and a reader
 * shares it: a file that is replaced or deleted while its answer is on the way stays whole for that answer.
 *
 * Names are kept as stored and found without regard to case. Either slash separates; what would leave the directory is refused.
 */
class MassMemory
{
public:
    static constexpr std::size_t MaxFiles = 1000;
    static constexpr std::size_t MaxName = 64;

    explicit MassMemory(std::uint64_t capacity) : m_capacity(capacity) {}

    void store(std::string_view name, Bytes content);
    std::shared_ptr<const Bytes> load(std::string_view name) const;
    void remove(std::string_view name);
    /// Throws unless @p directory is the one that there is.
    void checkDirectory(std::string_view directory) const;
    void checkDrive(std::string_view drive) const;

    std::uint64_t used() const { return m_used; }
    std::uint64_t free() const { return m_capacity - m_used; }
    void forEach(const std::function<void(const std::string &name, std::size_t size)> &visit) const;

private:
    struct File {
        std::string name;
        std::shared_ptr<const Bytes> content;
    };

    std::uint64_t m_capacity;
    std::uint64_t m_used = 0;
    std::map<std::string, File> m_files; ///< by name in upper case
};

} // namespace simulator
