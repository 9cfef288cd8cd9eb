#include "db/row_block.h"

#include <sys/mman.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <new>
#include <stdexcept>
#include <utility>

namespace kelo::platform {
namespace {

// Chunks grow to the size of a huge page, which spares a large result most of its page faults.
constexpr size_t kHugePage = size_t{2} << 20;

// Copies a text. Most are short: a call of memcpy would take longer than to copy them by two words, which
// overlap.
template <typename Word>
void CopyByTwoWords(char *to, const char *from, size_t size) {
    Word first;
    Word last;
    std::memcpy(&first, from, sizeof first);
    std::memcpy(&last, from + size - sizeof last, sizeof last);
    std::memcpy(to, &first, sizeof first);
    std::memcpy(to + size - sizeof last, &last, sizeof last);
}

inline void CopyText(char *to, const char *from, size_t size) {
    if (size > 2 * sizeof(uint64_t) || size < sizeof(uint16_t))
        std::memcpy(to, from, size);
    else if (size >= sizeof(uint64_t))
        CopyByTwoWords<uint64_t>(to, from, size);
    else if (size >= sizeof(uint32_t))
        CopyByTwoWords<uint32_t>(to, from, size);
    else
        CopyByTwoWords<uint16_t>(to, from, size);
}

} // namespace

template <typename Offset>
void RowBlock::WriteRow(char *row, std::span<const Cell> cells) {
    row[0] = sizeof(Offset);
    char *offsets = row + 1;
    char *text = offsets + cells.size() * sizeof(Offset);
    for (const Cell &cell : cells) {
        const auto offset = static_cast<Offset>(cell.text != nullptr ? text - row : 0);
        std::memcpy(offsets, &offset, sizeof offset);
        offsets += sizeof offset;
        if (cell.text == nullptr)
            continue;
        CopyText(text, cell.text, cell.size);
        text[cell.size] = '\0';
        text += cell.size + 1;
    }
}

void RowBlock::FreeChunk::operator()(char *chunk) const {
    std::free(chunk);
}

char *RowBlock::Allocate(size_t size) {
    if (size > freeSize_) {
        const size_t chunkSize = std::max(size, nextChunkSize_);
        std::unique_ptr<char, FreeChunk> chunk(static_cast<char *>(
            chunkSize == kHugePage ? std::aligned_alloc(kHugePage, chunkSize) : std::malloc(chunkSize)));
        if (chunk == nullptr)
            throw std::bad_alloc();
        if (chunkSize == kHugePage)
            madvise(chunk.get(), chunkSize, MADV_HUGEPAGE); // a hint: without huge pages it is only slower
        chunks_.push_back(std::move(chunk));
        free_ = chunks_.back().get();
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
    size_t lastSize = 0; // of the last text, before which all offsets are
    for (const Cell &cell : cells) {
        if (cell.text == nullptr)
            continue;
        lastSize = cell.size + 1;
        textSize += lastSize;
    }
    const size_t head = 1 + textSize - lastSize;
    const size_t offsetSize = head + cells.size() * sizeof(uint8_t) <= UINT8_MAX     ? sizeof(uint8_t)
                              : head + cells.size() * sizeof(uint16_t) <= UINT16_MAX ? sizeof(uint16_t)
                                                                                     : sizeof(uint32_t);
    const size_t size = 1 + cells.size() * offsetSize + textSize;
    if (size > UINT32_MAX)
        throw std::length_error("row too long");

    if (count_ == tables_.size() * kRowsPerTable)
        tables_.push_back(std::make_unique_for_overwrite<const char *[]>(kRowsPerTable));
    char *row = Allocate(size);
    switch (offsetSize) {
    case sizeof(uint8_t):
        WriteRow<uint8_t>(row, cells);
        break;
    case sizeof(uint16_t):
        WriteRow<uint16_t>(row, cells);
        break;
    default:
        WriteRow<uint32_t>(row, cells);
    }
    tables_[count_ / kRowsPerTable][count_ % kRowsPerTable] = row;
    ++count_;
}

} // namespace kelo::platform
