#pragma once

#include "kyvisa/core/Object.h"

#include <cstdint>
#include <shared_mutex>
#include <vector>

namespace kyvisa
{

/**
 * Turns handles into objects.
 *
 * A handle is the number of a slot (low 16 bits) and the slot's generation (high 16 bits, never 0). A slot that was freed
 * waits behind at least 1,024 others before it is used again, with the next generation, so that an old handle stays
 * unknown for tens of millions of opens.
 *
 * Looking up takes a shared lock for a few instructions; the object is used outside of it.
 */
class HandleTable
{
public:
    /// Enters @p object as a child of @p parent (0: of nobody). 0 when the table is full or @p parent is gone.
    ViObject insert(ObjectPointer object, ViObject parent);

    /// The object, or nullptr for a handle that is unknown or was closed.
    ObjectPointer find(ViObject handle) const;

    /// Takes the object out. Of several threads that close one handle exactly one gets it.
    ObjectPointer remove(ViObject handle);

    /// Takes out all children of @p parent.
    std::vector<ObjectPointer> removeChildren(ViObject parent);

    // Around fork(): the table is consistent in the child because the forking thread holds it.
    void lockForFork() { m_mutex.lock(); }
    void unlockInParent() { m_mutex.unlock(); }
    /// A lock for many readers knows its owner by the thread's number, and that is another one in the child.
    void unlockInChild() { std::construct_at(&m_mutex); }

private:
    static constexpr std::size_t MaxSlots = 0x10000;
    static constexpr std::size_t RestingSlots = 1024;

    struct Slot {
        ObjectPointer object;
        ViObject parent = 0;
        std::uint16_t generation = 1;
        std::uint16_t nextFree = 0; ///< of a free slot that is not the last one
    };

    const Slot *slotOf(ViObject handle) const;
    ObjectPointer release(std::size_t index) noexcept;

    mutable std::shared_mutex m_mutex;
    std::vector<Slot> m_slots;
    // Free slots stand in line by their own numbers: closing needs no memory.
    std::size_t m_freeCount = 0;
    std::uint16_t m_firstFree = 0;
    std::uint16_t m_lastFree = 0;
};

} // namespace kyvisa
