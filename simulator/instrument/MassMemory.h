#pragma once

#include "simulator/instrument/Bytes.h"

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace simulator
{

/**
 * The instrument's mass memory: one drive, "C:", with directories, in the simulator's memory. It takes over a block without copying it, and a reader
 * shares it: a file that is replaced or deleted while its answer is on the way stays whole for that answer.
 *
 * A path is relative to the current directory, or absolute with a drive or a leading separator; either slash separates, `.` and `..` are understood. No
 * path leads out of the drive: there is nothing behind it. Names are kept as stored and found without regard to case. All that goes wrong is thrown
 * as a ScpiError, -250 to -258.
 */
class MassMemory
{
public:
    static constexpr std::size_t MaxEntries = 1000; ///< files and directories
    static constexpr std::size_t MaxName = 64;
    static constexpr std::size_t MaxPath = 255;
    static constexpr std::size_t MaxDepth = 16;

    /// What is wrong with the medium, for tests of programs that have to cope.
    enum class Media : std::uint8_t { Normal, Missing, Corrupt, Protected };

    struct Entry {
        std::string name;
        std::size_t size = 0;
        bool isDirectory = false;
    };

    explicit MassMemory(std::uint64_t capacity) : m_capacity(capacity) {}

    void store(std::string_view path, Bytes content);
    std::shared_ptr<const Bytes> load(std::string_view path) const;
    void remove(std::string_view path);
    /// To a file name, or into a directory that is there. A file of that name is replaced.
    void copy(std::string_view from, std::string_view to);
    /// As copy(), for a directory with all that is in it too, but nothing is replaced by a directory.
    void move(std::string_view from, std::string_view to);

    void makeDirectory(std::string_view path);
    void removeDirectory(std::string_view path);
    /// The empty path is the root.
    void changeDirectory(std::string_view path);
    std::string currentDirectory() const;
    /// By name. The last part of @p path may have the wildcards `*` and `?`; the empty path is the current directory.
    std::vector<Entry> list(std::string_view path) const;

    /// Throws unless @p drive is the one that there is.
    void checkDrive(std::string_view drive) const;
    std::uint64_t used() const { return m_used; }
    std::uint64_t free() const { return m_capacity - m_used; }

    /// Every file with its path from the root, whatever the medium suffers from.
    void forEach(const std::function<void(const std::string &path, std::size_t size)> &visit) const;

    void setMedia(Media media) { m_media = media; }
    Media media() const { return m_media; }

private:
    using Names = std::vector<std::string>; ///< of directories from the root, then of a file perhaps
    struct Node {
        std::string name;
        std::shared_ptr<const Bytes> content; ///< null: a directory

        std::size_t size() const { return content ? content->size() : 0; }
    };
    using Nodes = std::map<std::string, Node>; ///< by path in upper case, from the root

    void checkReadable() const;
    void checkWritable() const;
    Names resolve(std::string_view path, bool wildcards = false) const;
    bool isDirectory(const Names &names) const;
    const Node &file(const Names &names, std::string_view path) const;
    Names destination(const Names &from, std::string_view to) const;
    void checkParent(const Names &names, std::string_view path) const;
    void put(const Names &names, std::shared_ptr<const Bytes> content, std::string_view path);

    std::uint64_t m_capacity;
    std::uint64_t m_used = 0;
    Media m_media = Media::Normal;
    Names m_current;
    Nodes m_nodes;
};

} // namespace simulator
