#include "kyvisa/core/HandleTable.h"

#include <algorithm>
#include <mutex>

namespace kyvisa
{

const HandleTable::Slot *HandleTable::slotOf(ViObject handle) const
{
    const std::size_t index = handle & 0xFFFF;
    if (index >= m_slots.size())
        return nullptr;
    const Slot &slot = m_slots[index];
    return slot.object && slot.generation == handle >> 16 ? &slot : nullptr;
}

ViObject HandleTable::insert(ObjectPointer object, ViObject parent)
{
    const std::unique_lock lock(m_mutex);
    if (parent != 0 && !slotOf(parent))
        return 0;
    std::size_t index;
    if (m_freeCount > RestingSlots || (m_slots.size() == MaxSlots && m_freeCount > 0)) {
        index = m_firstFree;
        m_firstFree = m_slots[index].nextFree;
        --m_freeCount;
    } else if (m_slots.size() < MaxSlots) {
        index = m_slots.size();
        m_slots.emplace_back();
    } else {
        return 0;
    }
    Slot &slot = m_slots[index];
    slot.object = std::move(object);
    slot.parent = parent;
    return static_cast<ViObject>(slot.generation) << 16 | static_cast<ViObject>(index);
}

ObjectPointer HandleTable::find(ViObject handle) const
{
    const std::shared_lock lock(m_mutex);
    const Slot *slot = slotOf(handle);
    return slot ? slot->object : nullptr;
}

ObjectPointer HandleTable::release(std::size_t index) noexcept
{
    Slot &slot = m_slots[index];
    (m_freeCount++ == 0 ? m_firstFree : m_slots[m_lastFree].nextFree) = static_cast<std::uint16_t>(index);
    m_lastFree = static_cast<std::uint16_t>(index);
    if (++slot.generation == 0)
        slot.generation = 1;
    slot.parent = 0;
    return std::move(slot.object);
}

ObjectPointer HandleTable::remove(ViObject handle)
{
    const std::unique_lock lock(m_mutex);
    return slotOf(handle) ? release(handle & 0xFFFF) : nullptr;
}

std::vector<ObjectPointer> HandleTable::removeChildren(ViObject parent)
{
    const std::unique_lock lock(m_mutex);
    const auto isChild = [parent](const Slot &slot) { return slot.object && slot.parent == parent; };
    std::vector<ObjectPointer> children;
    // Either there is room for all of them, or none is taken out.
    children.reserve(static_cast<std::size_t>(std::count_if(m_slots.begin(), m_slots.end(), isChild)));
    for (std::size_t i = 0; i < m_slots.size(); ++i)
        if (isChild(m_slots[i]))
            children.push_back(release(i));
    return children;
}

} // namespace kyvisa
