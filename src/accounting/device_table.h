#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace kelo {

// A sending device.
struct Device {
    std::string name;
    size_t slot = 0; // of its counts in the table
};

// What is counted of a device.
struct DeviceCounts {
    uint64_t total = 0;       // in the histogram
    int32_t inOpenSample = 0; // since the last sample was closed
    uint32_t number = 0;      // of the device in the table, from 1 on
};

// The devices in the order in which they were first asked for. They keep their place in memory.
class DeviceTable {
public:
    // The counts of the device of this name, compared byte by byte; of a new one when there is none yet. They
    // are valid until the next call. Throws std::bad_alloc and then leaves the table unchanged.
    DeviceCounts &Find(const std::string &name);

    size_t Size() const { return size_; }
    Device &operator[](size_t i) const { return chunks_[i / kChunk][i % kChunk]; }
    Device &DeviceOf(const DeviceCounts &counts) const { return (*this)[counts.number - 1]; }
    DeviceCounts &CountsOf(const Device &device) { return slots_[device.slot].counts; }

private:
    static constexpr size_t kChunk = 256;

    // A name of up to 15 bytes and its size, or the hash of a longer one, whose device has to be looked at.
    struct Key {
        bool operator==(const Key &) const = default;
        uint64_t head = 0;
        uint64_t tail = 0;
    };

    // A device, from the slot of its hash on, before the first free one. With many devices, loading the cache
    // line of a slot is the main cost of counting a record, so all that it takes is in this line.
    struct alignas(32) Slot {
        Key key;
        DeviceCounts counts; // the number is 0 in a free slot
    };

    static Key KeyOf(const std::string &name, size_t hash);
    DeviceCounts &Add(const std::string &name, const Key &key, size_t hash);
    void Reserve();
    static size_t FreeSlot(const std::vector<Slot> &slots, size_t hash);

    std::vector<std::unique_ptr<Device[]>> chunks_;
    std::vector<Slot> slots_; // a power of two of them, at least a quarter free
    size_t size_ = 0;
};

} // namespace kelo
