#include "accounting/device_table.h"

#include <functional>

namespace kelo {

Device &DeviceTable::Find(const std::string &name) {
    const auto hash = static_cast<uint32_t>(std::hash<std::string>{}(name));
    const size_t mask = slots_.size() - 1;
    for (size_t i = hash & mask; !slots_.empty() && slots_[i].number != 0; i = (i + 1) & mask) {
        if (slots_[i].hash != hash)
            continue;
        Device &device = (*this)[slots_[i].number - 1];
        if (device.name == name)
            return device;
    }
    return Add(name, hash);
}

Device &DeviceTable::Add(const std::string &name, uint32_t hash) {
    Reserve();
    Device &device = (*this)[size_];
    device.name = name;
    ++size_;
    FreeSlot(slots_, hash) = {hash, static_cast<uint32_t>(size_)};
    return device;
}

// Makes room for one more device.
void DeviceTable::Reserve() {
    constexpr size_t kFewestSlots = 64;
    if (size_ == chunks_.size() * kChunk)
        chunks_.push_back(std::make_unique<Device[]>(kChunk));
    if ((size_ + 1) * 4 <= slots_.size() * 3)
        return;
    std::vector<Slot> slots(slots_.empty() ? kFewestSlots : 2 * slots_.size());
    for (const Slot &slot : slots_) {
        if (slot.number != 0)
            FreeSlot(slots, slot.hash) = slot;
    }
    slots_.swap(slots);
}

DeviceTable::Slot &DeviceTable::FreeSlot(std::vector<Slot> &slots, uint32_t hash) {
    size_t i = hash & (slots.size() - 1);
    while (slots[i].number != 0)
        i = (i + 1) & (slots.size() - 1);
    return slots[i];
}

} // namespace kelo
