#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

namespace kelo::platform {

// Positions of a result's columns by their names, without regard to the case of ASCII letters, as in SQL.
//
// Readers ask for the same columns in the same order in every row, so the index remembers which column
// followed which, and looks there before it searches.
class ColumnIndex {
public:
    static constexpr uint32_t kNone = UINT32_MAX;

    ColumnIndex() = default;
    ColumnIndex(const ColumnIndex &) = delete;
    ColumnIndex &operator=(const ColumnIndex &) = delete;

    // Appends the next column. Throws std::bad_alloc.
    void Add(std::string_view name);

    uint32_t Count() const { return static_cast<uint32_t>(nameAt_.size()); }

    // Position of the first column with this name, or kNone.
    uint32_t Find(const char *name) {
        if (follower_.empty())
            return kNone;
        return IsSame(expectedName_, name) ? Expect(expected_) : Search(name);
    }

private:
    static bool IsSame(const char *a, const char *b) {
        for (; *a == *b; ++a, ++b) {
            if (*a == '\0')
                return true;
        }
        return false;
    }
    const char *Name(uint32_t column) const { return names_.data() + nameAt_[column]; }
    // Notes that a column was found, and returns it.
    uint32_t Expect(uint32_t found) {
        last_ = found;
        expected_ = follower_[found];
        expectedName_ = Name(expected_);
        return found;
    }
    uint32_t Search(const char *name);
    // The slot of `name`, or the empty one for it.
    size_t SlotOf(const char *name) const;
    void Grow();

    std::vector<char> names_;        // one after the other, each NUL-terminated
    std::vector<uint32_t> nameAt_;   // by position, offset into `names_`
    std::vector<uint32_t> follower_; // by position, the column that was asked for after it
    uint32_t last_ = 0;              // the column that was found last
    uint32_t expected_ = 0;          // its follower
    const char *expectedName_ = nullptr;
    std::vector<uint32_t> slots_; // open addressing; a power of two, half empty at the least
};

} // namespace kelo::platform
