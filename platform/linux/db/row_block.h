#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>
#include <span>
#include <vector>

namespace kelo::platform {

// The value of one column of one row: NUL-terminated text, null for NULL.
struct Cell {
    const char *text = nullptr;
    size_t size = 0; // bytes, the NUL not counted
};

// Rows of texts, packed one after the other into a few large chunks that never move or grow. A row takes its
// texts with their NULs, one byte per cell (two if its last text does not begin in the first 256 bytes, four
// if not in the first 64 KiB) and nine bytes.
class RowBlock {
public:
    // Appends a row. Throws std::bad_alloc, or std::length_error for a row of 4 GiB;
    // either leaves the rows unchanged.
    void Add(std::span<const Cell> cells);

    uint64_t Count() const { return count_; }

    // Text of a cell, null for NULL. Both positions must exist.
    const char *Text(uint64_t row, size_t column) const {
        const char *start = tables_[row / kRowsPerTable][row % kRowsPerTable];
        switch (start[0]) {
        case sizeof(uint8_t):
            return ReadText<uint8_t>(start, column);
        case sizeof(uint16_t):
            return ReadText<uint16_t>(start, column);
        default:
            return ReadText<uint32_t>(start, column);
        }
    }

private:
    // A row is a byte with the width of its offsets, the offsets of its texts from the row's start, and the
    // texts. No text starts at 0, so that offset means NULL.
    template <typename Offset>
    static void WriteRow(char *row, std::span<const Cell> cells);
    template <typename Offset>
    static const char *ReadText(const char *row, size_t column) {
        Offset offset;
        std::memcpy(&offset, row + 1 + column * sizeof offset, sizeof offset);
        return offset != 0 ? row + offset : nullptr;
    }

    struct FreeChunk {
        void operator()(char *chunk) const;
    };
    static constexpr size_t kRowsPerTable = 256;

    char *Allocate(size_t size);

    uint64_t count_ = 0;
    std::vector<std::unique_ptr<char, FreeChunk>> chunks_;
    char *free_ = nullptr; // rest of the newest chunk
    size_t freeSize_ = 0;
    size_t nextChunkSize_ = 4096;
    std::vector<std::unique_ptr<const char *[]>> tables_; // where each row starts
};

} // namespace kelo::platform
