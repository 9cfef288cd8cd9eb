#include "db/row_block.h"

#include <sys/mman.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <new>
#include <stdexcept>

namespace kelo::platform {
namespace {

// Chunks grow to the size of a huge page, which spares a large result most of its page faults.
constexpr size_t kHugePage = size_t{2} << 20;

// A row is a byte that tells the width of its offsets, the offsets of its texts from the row's start, and the
// texts. No text starts at 0, so that offset stands for NULL.
enum Width : char { kNarrow = 0, kWide = 1 };

template <typename Offset>
void WriteRow(char *row, Width width, std::span<const Cell> cells) {
    row[0] = width;
    char *offsets = row + 1;
    char *text = offsets + cells.size() * sizeof(Offset);
    for (const Cell &cell : cells) {
        const auto offset = static_cast<Offset>(cell.text != nullptr ? text - row : 0);
        std::memcpy(offsets, &offset, sizeof offset);
        offsets += sizeof offset;
        if (cell.text == nullptr)
            continue;
        std::memcpy(text, cell.text, cell.size);
        text[cell.size] = '\0';
        text += cell.size + 1;
    }
}

template <typename Offset>
const char *ReadText(const char *row, size_t column) {
    Offset offset;
    std::memcpy(&offset, row + 1 + column * sizeof offset, sizeof offset);
    return offset != 0 ? row + offset : nullptr;
}

} // namespace

void RowBlock::FreeChunk::operator()(char *chunk) const {
    std::free(chunk);
}

char *RowBlock::Allocate(size_t size) {
    if (size > freeSize_) {
        const size_t chunkSize = std::max(size, nextChunkSize_);
        chunks_.reserve(chunks_.size() + 1);
        auto *chunk = static_cast<char *>(chunkSize == kHugePage ? std::aligned_alloc(kHugePage, chunkSize)
                                                                 : std::malloc(chunkSize));
        if (chunk == nullptr)
            throw std::bad_alloc();
        if (chunkSize == kHugePage)
            madvise(chunk, chunkSize, MADV_HUGEPAGE); // a hint: without huge pages it is only slower
        chunks_.emplace_back(chunk);
        free_ = chunk;
        freeSize_ = chunkSize;
        nextChunkSize_ = std::min(2 * nextChunkSize_, kHugePage);
    }
    char *start = free_;
    free_ += size;
    freeSize_ -= size;
    return start;
}

void RowBlock::Add(std::span<const Cell> cells) {
    size_t textSize = 0;
    for (const Cell &cell : cells)
        textSize += cell.text != nullptr ? cell.size + 1 : 0;
    const bool narrow = 1 + cells.size() * sizeof(uint16_t) + textSize <= UINT16_MAX;
    const size_t size = 1 + cells.size() * (narrow ? sizeof(uint16_t) : sizeof(uint32_t)) + textSize;
    if (size > UINT32_MAX)
        throw std::length_error("row too long");

    if (count_ == tables_.size() * kRowsPerTable)
        tables_.push_back(std::make_unique_for_overwrite<const char *[]>(kRowsPerTable));
    char *row = Allocate(size);
    if (narrow)
        WriteRow<uint16_t>(row, kNarrow, cells);
    else
        WriteRow<uint32_t>(row, kWide, cells);
    tables_[count_ / kRowsPerTable][count_ % kRowsPerTable] = row;
    ++count_;
}

const char *RowBlock::Text(uint64_t row, size_t column) const {
    const char *start = tables_[row / kRowsPerTable][row % kRowsPerTable];
    return start[0] == kNarrow ? ReadText<uint16_t>(start, column) : ReadText<uint32_t>(start, column);
}

} // namespace kelo::platform
