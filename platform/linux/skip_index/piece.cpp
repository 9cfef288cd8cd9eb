#include "skip_index/piece.h"

#include <cstring>

namespace kelo::platform {
namespace {

constexpr uint64_t kMultiplier = 0x9FB21C651E98DF25;

uint64_t Mixed(uint64_t hash, uint64_t word) {
    hash = (hash ^ word) * kMultiplier;
    return hash ^ (hash >> 32);
}

using Tile = std::array<uint64_t, 64>;

// Exchanges rows and columns of 64 x 64 bits, by halves of halves.
void Transpose(Tile &tile) {
    uint64_t mask = 0x00000000FFFFFFFF;
    for (size_t half = 32; half != 0; half /= 2, mask ^= mask << half) {
        for (size_t row = 0; row < tile.size(); row = (row + half + 1) & ~half) {
            const uint64_t swapped = ((tile[row] >> half) ^ tile[row + half]) & mask;
            tile[row] ^= swapped << half;
            tile[row + half] ^= swapped;
        }
    }
}

} // namespace

uint64_t HashOf(std::string_view bytes, uint64_t seed) {
    uint64_t hash = Mixed(seed, bytes.size());
    while (!bytes.empty()) {
        uint64_t word = 0;
        const size_t size = bytes.copy(reinterpret_cast<char *>(&word), sizeof word);
        hash = Mixed(hash, word);
        bytes.remove_prefix(size);
    }
    return Mixed(hash, seed);
}

uint32_t ChecksumOf(const Slice &slice, uint64_t fileNumber, int64_t piece, size_t gram) {
    uint64_t hash = Mixed(fileNumber, static_cast<uint64_t>(piece) * kGramBits + gram);
    for (size_t word = 0; word < kWordsPerSlice; ++word)
        hash = Mixed(hash, slice.Word(word));
    return static_cast<uint32_t>(Mixed(hash, fileNumber));
}

Piece::Piece() : blocks_(std::make_unique<std::array<GramBits, kBlocksPerPiece>>()) {}

void Piece::Clear() {
    for (GramBits &block : *blocks_)
        block.fill(0);
    rows_.fill(0);
    zones_.fill({});
    StartBlock(0);
}

void Piece::StartBlock(size_t block) {
    block_ = block;
    flags_.fill(0);
    severity_.reset();
    facility_.reset();
}

void Piece::EndBlock() {
    AddFlags(flags_, (*blocks_)[block_]);
}

// Most values are those of the row before.
void Piece::AddToken(TokenColumn column, std::string_view value, std::optional<std::string> &last) {
    if (last == value)
        return;
    for (const uint16_t bit : BitsOfToken(column, value))
        flags_[bit] = 1;
    last = value;
}

void Piece::Add(size_t number, const IndexedRow &row) {
    const size_t block = number / kIdsPerBlock;
    if (block != block_) {
        EndBlock();
        StartBlock(block);
    }
    AddGrams(row.message, flags_);
    AddToken(TokenColumn::kSeverity, row.severity, severity_);
    AddToken(TokenColumn::kFacility, row.facility, facility_);
    Zone &zone = zones_[block / 64];
    for (size_t column = 0; column < zone.size(); ++column)
        zone[column].Add(row.times[column]);
    ++rows_[block];
}

void Piece::Finish() {
    EndBlock();
    for (size_t block = 0; block < rows_.size(); ++block) {
        if (rows_[block] == kIdsPerBlock)
            continue;
        (*blocks_)[block].fill(~uint64_t{0});
        zones_[block / 64].fill(kAllTimes);
    }
}

BuiltPiece Piece::Build(uint64_t fileNumber, int64_t piece) const {
    BuiltPiece built{Slices(fileNumber, piece), {zones_, 0}};
    built.zones.checksum = ChecksumOf(built.zones, fileNumber, piece);
    return built;
}

std::unique_ptr<Slice[]> Piece::Slices(uint64_t fileNumber, int64_t piece) const {
    auto slices = std::make_unique<Slice[]>(kGramBits);
    for (size_t word = 0; word < kWordsPerSlice; ++word) {
        for (size_t grams = 0; grams < kGramBits / 64; ++grams) {
            Tile tile;
            for (size_t block = 0; block < tile.size(); ++block)
                tile[block] = (*blocks_)[word * 64 + block][grams];
            Transpose(tile);
            for (size_t gram = 0; gram < tile.size(); ++gram)
                slices[grams * 64 + gram].SetWord(word, tile[gram]);
        }
    }
    for (size_t gram = 0; gram < kGramBits; ++gram)
        slices[gram].checksum = ChecksumOf(slices[gram], fileNumber, piece, gram);
    return slices;
}

} // namespace kelo::platform
