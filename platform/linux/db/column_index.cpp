#include "db/column_index.h"

#include <sqlite3.h>

namespace kelo::platform {
namespace {

// FNV-1a: column names are a few bytes long. The bit of the letter case is ignored.
size_t HashOf(const char *name) {
    uint32_t hash = 2166136261U;
    for (; *name != '\0'; ++name)
        hash = (hash ^ (static_cast<unsigned char>(*name) | 0x20U)) * 16777619U;
    return hash;
}

} // namespace

void ColumnIndex::Add(std::string_view name) {
    const uint32_t column = Count();
    const auto offset = static_cast<uint32_t>(names_.size());
    names_.insert(names_.end(), name.begin(), name.end());
    names_.push_back('\0');
    nameAt_.push_back(offset);
    follower_.push_back(0);
    expectedName_ = Name(expected_);
    if (slots_.size() < 2 * nameAt_.size()) {
        Grow();
        return;
    }
    uint32_t &slot = slots_[SlotOf(Name(column))];
    if (slot == kNone) // of columns with the same name the first is used
        slot = column;
}

void ColumnIndex::Grow() {
    slots_.assign(slots_.empty() ? 32 : 2 * slots_.size(), kNone);
    for (uint32_t column = 0; column < Count(); ++column) {
        uint32_t &slot = slots_[SlotOf(Name(column))];
        if (slot == kNone)
            slot = column;
    }
}

size_t ColumnIndex::SlotOf(const char *name) const {
    const size_t mask = slots_.size() - 1;
    size_t slot = HashOf(name) & mask;
    while (slots_[slot] != kNone && sqlite3_stricmp(Name(slots_[slot]), name) != 0)
        slot = (slot + 1) & mask;
    return slot;
}

uint32_t ColumnIndex::Search(const char *name) {
    const uint32_t found = slots_[SlotOf(name)];
    if (found == kNone)
        return kNone;
    follower_[last_] = found;
    return Expect(found);
}

} // namespace kelo::platform
