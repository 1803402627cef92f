#include "kyvisa/core/HandleTable.h"

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
    if (m_free.size() > RestingSlots || (m_slots.size() == MaxSlots && !m_free.empty())) {
        index = m_free.front();
        m_free.pop_front();
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

ObjectPointer HandleTable::release(std::size_t index)
{
    Slot &slot = m_slots[index];
    m_free.push_back(static_cast<std::uint16_t>(index));
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
    std::vector<ObjectPointer> children;
    for (std::size_t i = 0; i < m_slots.size(); ++i)
        if (m_slots[i].object && m_slots[i].parent == parent)
            children.push_back(release(i));
    return children;
}

} // namespace kyvisa
