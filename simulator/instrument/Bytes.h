#pragma once

#include <cstddef>
#include <memory>
#include <span>

namespace simulator
{

/**
 * The memory that all blocks share, the ones on their way in and the stored ones, so that no set of clients can eat the machine's. The room
 * of one block that has gone is kept for the next one: fresh memory costs the kernel more time than receiving into it.
 */
class ByteBudget
{
public:
    /// Larger rooms are given back at once.
    static constexpr std::size_t MaxSpare = std::size_t{128} << 20;

    struct Room {
        std::byte *data = nullptr;
        std::size_t capacity = 0;
    };

    explicit ByteBudget(std::size_t capacity) : m_capacity(capacity) {}
    ~ByteBudget() { dropSpare(); }
    ByteBudget(const ByteBudget &) = delete;
    ByteBudget &operator=(const ByteBudget &) = delete;

    bool take(std::size_t bytes);
    void give(std::size_t bytes) { m_used -= bytes; }
    /// A kept room of at most @p most bytes, taken already; none: data is null.
    Room takeSpare(std::size_t most);
    void keepSpare(Room room);
    std::size_t capacity() const { return m_capacity; }
    std::size_t used() const { return m_used - m_spare.capacity; }

private:
    void dropSpare();

    std::size_t m_capacity;
    std::size_t m_used = 0;
    Room m_spare;
};

/**
 * The content of a block. Grows as bytes arrive and is never cleared first: a header that announces a gigabyte costs nothing until the gigabyte
 * comes. A receiver writes straight into it (space(), then commit()), and from then on the bytes are handed on, not copied:
 *
 *     std::span<std::byte> to = bytes.space(remaining);
 *     bytes.commit(recv(fd, to.data(), to.size(), 0));
 */
class Bytes
{
public:
    explicit Bytes(std::shared_ptr<ByteBudget> budget) : m_budget(std::move(budget)) {}
    Bytes(Bytes &&other) noexcept;
    Bytes &operator=(Bytes &&other) noexcept;
    ~Bytes();

    /// Room for more, at most @p expected bytes; empty when the budget or the machine has none.
    std::span<std::byte> space(std::size_t expected);
    /// Takes over @p count bytes that were written to the front of the last space().
    void commit(std::size_t count) { m_size += count; }
    /// Copies what fits. False when not all of it did.
    bool append(std::span<const std::byte> bytes, std::size_t expected);
    void dropLast() { --m_size; }
    /// Gives back the room behind the content.
    void fit();

    std::size_t size() const { return m_size; }
    std::span<const std::byte> view() const { return {m_data, m_size}; }

private:
    bool resize(std::size_t capacity);
    void release();

    std::shared_ptr<ByteBudget> m_budget;
    std::byte *m_data = nullptr;
    std::size_t m_size = 0;
    std::size_t m_capacity = 0;
};

} // namespace simulator
