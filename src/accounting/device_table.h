#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace kelo {

// The counts of one sending device. In a separate cache line: with many devices, loading that line is the
// main cost of counting a record.
struct alignas(64) Device {
    std::string name;
    uint64_t total = 0;       // in the histogram
    int32_t inOpenSample = 0; // since the last sample was closed
};

// The devices in the order in which they were first asked for. They keep their place in memory.
class DeviceTable {
public:
    // The device of this name, compared byte by byte; a new one when there is none yet. Throws std::bad_alloc
    // and then leaves the table unchanged.
    Device &Find(const std::string &name);

    size_t Size() const { return size_; }
    Device &operator[](size_t i) const { return chunks_[i / kChunk][i % kChunk]; }

private:
    static constexpr size_t kChunk = 256;

    // The position of a device with this hash: from the slot of the hash on, before the first free one.
    struct Slot {
        uint32_t hash = 0;
        uint32_t number = 0; // of the device, from 1 on; 0 for a free slot
    };

    Device &Add(const std::string &name, uint32_t hash);
    void Reserve();
    static Slot &FreeSlot(std::vector<Slot> &slots, uint32_t hash);

    std::vector<std::unique_ptr<Device[]>> chunks_;
    std::vector<Slot> slots_; // a power of two of them, at least a quarter free
    size_t size_ = 0;
};

} // namespace kelo
