#include "accounting/device_table.h"

#include <bit>
#include <cstring>
#include <functional>

namespace kelo {
namespace {

constexpr size_t kShortest = 16; // of the names that are too long for a key

template <typename Word>
uint64_t Load(const char *text) {
    Word word;
    std::memcpy(&word, text, sizeof word);
    return word;
}

// The first and the last bytes of a name, which overlap.
template <typename Word>
uint64_t Ends(const std::string &name) {
    return Load<Word>(name.data()) | Load<Word>(name.data() + name.size() - sizeof(Word)) << 8 * sizeof(Word);
}

} // namespace

// In words, because calls of memcpy and memcmp would take longer.
DeviceTable::Key DeviceTable::KeyOf(const std::string &name, size_t hash) {
    const size_t size = name.size();
    if (size >= kShortest)
        return {hash, kShortest};
    if (size >= sizeof(uint64_t)) {
        // The first one of the last bytes is in the head too. The size takes its place.
        constexpr int kFirst = std::endian::native == std::endian::little ? 0 : 56;
        const uint64_t last = Load<uint64_t>(name.data() + size - sizeof(uint64_t));
        return {Load<uint64_t>(name.data()), (last & ~(uint64_t{0xFF} << kFirst)) | size << kFirst};
    }
    if (size >= sizeof(uint32_t))
        return {Ends<uint32_t>(name), size};
    if (size >= sizeof(uint16_t))
        return {Ends<uint16_t>(name), size};
    return {size == 1 ? Load<uint8_t>(name.data()) : 0, size};
}

DeviceCounts &DeviceTable::Find(const std::string &name) {
    const size_t hash = std::hash<std::string>{}(name);
    const Key key = KeyOf(name, hash);
    const size_t mask = slots_.size() - 1;
    for (size_t i = hash & mask; !slots_.empty() && slots_[i].counts.number != 0; i = (i + 1) & mask) {
        Slot &slot = slots_[i];
        if (slot.key == key && (name.size() < kShortest || DeviceOf(slot.counts).name == name))
            return slot.counts;
    }
    return Add(name, key, hash);
}

DeviceCounts &DeviceTable::Add(const std::string &name, const Key &key, size_t hash) {
    Reserve();
    Device &device = (*this)[size_];
    device.name = name;
    device.slot = FreeSlot(slots_, hash);
    Slot &slot = slots_[device.slot];
    ++size_;
    slot.key = key;
    slot.counts.number = static_cast<uint32_t>(size_);
    return slot.counts;
}

// Makes room for one more device.
void DeviceTable::Reserve() {
    constexpr size_t kFewestSlots = 64;
    if (size_ == chunks_.size() * kChunk)
        chunks_.push_back(std::make_unique<Device[]>(kChunk));
    if ((size_ + 1) * 4 <= slots_.size() * 3)
        return;
    std::vector<Slot> slots(slots_.empty() ? kFewestSlots : 2 * slots_.size());
    for (size_t i = 0; i < size_; ++i) {
        Device &device = (*this)[i];
        const size_t slot = FreeSlot(slots, std::hash<std::string>{}(device.name));
        slots[slot] = slots_[device.slot];
        device.slot = slot;
    }
    slots_.swap(slots);
}

size_t DeviceTable::FreeSlot(const std::vector<Slot> &slots, size_t hash) {
    size_t i = hash & (slots.size() - 1);
    while (slots[i].counts.number != 0)
        i = (i + 1) & (slots.size() - 1);
    return i;
}

} // namespace kelo
