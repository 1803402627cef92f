#include "simulator/instrument/Bytes.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <utility>

namespace simulator
{
namespace
{
constexpr std::size_t FirstRoom = 64 * 1024;
}

bool ByteBudget::take(std::size_t bytes)
{
    if (bytes > m_capacity - m_used)
        dropSpare();
    if (bytes > m_capacity - m_used)
        return false;
    m_used += bytes;
    return true;
}

ByteBudget::Room ByteBudget::takeSpare(std::size_t most)
{
    return m_spare.capacity <= most ? std::exchange(m_spare, {}) : Room{};
}

void ByteBudget::keepSpare(Room room)
{
    if (room.capacity > m_spare.capacity && room.capacity <= MaxSpare)
        std::swap(room, m_spare);
    std::free(room.data);
    give(room.capacity);
}

void ByteBudget::dropSpare()
{
    std::free(m_spare.data);
    give(std::exchange(m_spare, {}).capacity);
}

Bytes::Bytes(Bytes &&other) noexcept
    : m_budget(other.m_budget), m_data(std::exchange(other.m_data, nullptr)), m_size(std::exchange(other.m_size, 0)),
      m_capacity(std::exchange(other.m_capacity, 0))
{
}

Bytes &Bytes::operator=(Bytes &&other) noexcept
{
    if (this != &other) {
        release();
        m_budget = other.m_budget;
        m_data = std::exchange(other.m_data, nullptr);
        m_size = std::exchange(other.m_size, 0);
        m_capacity = std::exchange(other.m_capacity, 0);
    }
    return *this;
}

Bytes::~Bytes()
{
    release();
}

void Bytes::release()
{
    m_budget->keepSpare({m_data, m_capacity});
    m_data = nullptr;
    m_size = m_capacity = 0;
}

std::span<std::byte> Bytes::space(std::size_t expected)
{
    if (expected == 0)
        return {};
    if (m_capacity == 0 && expected > FirstRoom) {
        const ByteBudget::Room room = m_budget->takeSpare(expected);
        m_data = room.data;
        m_capacity = room.capacity;
    }
    if (m_size == m_capacity) {
        // Doubling, but never beyond what is announced; close to the budget's end in smaller steps.
        std::size_t room = std::min(expected, std::max(FirstRoom, m_capacity));
        if (!resize(m_capacity + room)) {
            room = std::min(expected, FirstRoom);
            if (!resize(m_capacity + room))
                return {};
        }
    }
    return {m_data + m_size, std::min(expected, m_capacity - m_size)};
}

bool Bytes::append(std::span<const std::byte> bytes, std::size_t expected)
{
    while (!bytes.empty()) {
        const std::span<std::byte> to = space(expected);
        if (to.empty())
            return false;
        const std::size_t count = std::min(to.size(), bytes.size());
        std::memcpy(to.data(), bytes.data(), count);
        commit(count);
        bytes = bytes.subspan(count);
        expected -= count;
    }
    return true;
}

void Bytes::fit()
{
    if (m_size == 0)
        release();
    else
        resize(m_size);
}

bool Bytes::resize(std::size_t capacity)
{
    if (capacity > m_capacity && !m_budget->take(capacity - m_capacity))
        return false;
    // For large sizes the C library moves pages, not bytes.
    auto *data = static_cast<std::byte *>(std::realloc(m_data, capacity));
    if (data == nullptr) {
        if (capacity > m_capacity)
            m_budget->give(capacity - m_capacity);
        return false;
    }
    if (capacity < m_capacity)
        m_budget->give(m_capacity - capacity);
    m_data = data;
    m_capacity = capacity;
    return true;
}

} // namespace simulator
