#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "skip_index/grams.h"
#include "skip_index/zone.h"

namespace kelo::platform {

// How ids are divided. A block is what the index accepts or rules out; a piece is what is built at once; a
// segment is what is read at once.
inline constexpr int64_t kIdsPerBlock = 32;
inline constexpr int64_t kIdsPerPiece = 16'384;
inline constexpr int64_t kPiecesPerSegment = 8;
inline constexpr int64_t kIdsPerSegment = kIdsPerPiece * kPiecesPerSegment;

inline constexpr size_t kBlocksPerPiece = kIdsPerPiece / kIdsPerBlock;
inline constexpr size_t kWordsPerSlice = kBlocksPerPiece / 64;

// One bit of every block of a piece, and a check sum, as it is in the file.
struct Slice {
    // The bits of 64 blocks, the first one in the lowest bit. In the file they begin at multiples of four
    // bytes.
    uint64_t Word(size_t index) const {
        uint64_t word = 0;
        std::memcpy(&word, &halves[2 * index], sizeof word);
        return word;
    }
    void SetWord(size_t index, uint64_t word) { std::memcpy(&halves[2 * index], &word, sizeof word); }

    std::array<uint32_t, 2 * kWordsPerSlice> halves;
    uint32_t checksum;
};
static_assert(sizeof(Slice) == 8 * kWordsPerSlice + 4);
inline constexpr size_t kPieceBytes = kGramBits * sizeof(Slice) + sizeof(ZoneMap);
inline constexpr size_t kSegmentBytes = kPieceBytes * kPiecesPerSegment;

// The check sum of the slice of bit `gram` in `piece`. It depends on where the slice is and on the file's own
// number, so that nothing that is left of another file or place passes for it.
uint32_t ChecksumOf(const Slice &slice, uint64_t fileNumber, int64_t piece, size_t gram);

// 64-bit hash of bytes, the same on every machine of the same byte order.
uint64_t HashOf(std::string_view bytes, uint64_t seed);

// What the index takes of a row.
struct IndexedRow {
    std::string_view message; // "" if it has none, as the next two
    std::string_view severity;
    std::string_view facility;
    Zone times; // none for NULL
};

// A piece as it is written.
struct BuiltPiece {
    std::unique_ptr<Slice[]> slices; // those of gram 0, 1 and so on
    ZoneMap zones;
};

// A piece that is being built.
class Piece {
public:
    // Throws std::bad_alloc.
    Piece();
    void Clear();
    // Adds the row with this number in the piece, each once; fastest in ascending order.
    void Add(size_t number, const IndexedRow &row);
    // After the last row: makes a block or zone with fewer rows than ids fit every search. The others were
    // deleted, and come back when somebody copies an older database over the content of this one.
    void Finish();
    // All of it with its check sums.
    BuiltPiece Build(uint64_t fileNumber, int64_t piece) const;

private:
    void StartBlock(size_t block);
    void EndBlock();
    void AddToken(TokenColumn column, std::string_view value, std::optional<std::string> &last);
    std::unique_ptr<Slice[]> Slices(uint64_t fileNumber, int64_t piece) const;

    // The block of the newest row, and its last values.
    size_t block_ = 0;
    GramFlags flags_{};
    std::optional<std::string> severity_;
    std::optional<std::string> facility_;
    std::unique_ptr<std::array<GramBits, kBlocksPerPiece>> blocks_;
    std::array<Zone, kZonesPerPiece> zones_{};
    std::array<uint8_t, kBlocksPerPiece> rows_{}; // of each block
};

} // namespace kelo::platform
