#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <vector>

namespace kelo::platform {

// The value of one column of one row: NUL-terminated text, null for NULL.
struct Cell {
    const char *text = nullptr;
    size_t size = 0; // bytes, the NUL not counted
};

// Rows of texts, packed one behind the other into a few large chunks that never move or grow. A row costs its
// texts with their NULs, two bytes a cell (four where the row passes 64 KiB) and nine bytes.
class RowBlock {
public:
    explicit RowBlock(size_t columnCount) : columnCount_(columnCount) {}

    // Appends a row of `columnCount` cells. Throws std::bad_alloc, or std::length_error for a row of 4 GiB;
    // either leaves the rows as they were.
    void Add(std::span<const Cell> cells);

    uint64_t Count() const { return count_; }

    // Text of a cell, null for NULL. Both positions have to exist.
    const char *Text(uint64_t row, size_t column) const;

private:
    struct FreeChunk {
        void operator()(char *chunk) const;
    };
    static constexpr size_t kRowsPerTable = 256;

    char *Allocate(size_t size);

    size_t columnCount_;
    uint64_t count_ = 0;
    std::vector<std::unique_ptr<char, FreeChunk>> chunks_;
    char *free_ = nullptr; // rest of the newest chunk
    size_t freeSize_ = 0;
    size_t nextChunkSize_ = 4096;
    std::vector<std::unique_ptr<const char *[]>> tables_; // where each row starts
};

} // namespace kelo::platform
