#include "skip_index/candidates.h"

#include <algorithm>

namespace kelo::platform {
namespace {

// Ranges with a smaller gap are read as one: finding the next row costs as much as reading some.
constexpr int64_t kSmallGap = kIdsPerBlock;

bool IsEmpty(const IdRange &range) {
    return range.first > range.last;
}

} // namespace

Candidates::Candidates(const IndexFile &file, const IndexHeader &header, const Need &need, const IdRange &ids)
    : file_(file), header_(header), need_(need), ids_(ids) {
    const int64_t base = header.basePiece * kIdsPerPiece;
    const int64_t first = std::clamp(ids.first, header.FirstId(), header.EndId());
    const int64_t end = std::min(ids.last, header.EndId() - 1) + 1;
    firstSegment_ = (first - base) / kIdsPerSegment;
    endSegment_ = end <= first ? firstSegment_ : (end - 1 - base) / kIdsPerSegment + 1;
}

bool Candidates::Next(bool isAscending, std::vector<IdRange> &ranges) {
    // What is before the index, its segments, and what is behind it.
    const int64_t steps = endSegment_ - firstSegment_ + 2;
    if (step_ >= steps)
        return false;
    const int64_t step = isAscending ? step_ : steps - 1 - step_;
    ++step_;
    if (step == 0)
        AddOutside({ids_.first, header_.FirstId() - 1}, ranges);
    else if (step == steps - 1)
        AddOutside({header_.EndId(), ids_.last}, ranges);
    else
        AddSegment(firstSegment_ + step - 1, isAscending, ranges);
    return true;
}

int64_t Candidates::FirstIdOf(int64_t segment) const {
    return header_.basePiece * kIdsPerPiece + segment * kIdsPerSegment;
}

IdRange Candidates::Rest(bool isAscending) const {
    const int64_t steps = endSegment_ - firstSegment_ + 2;
    const int64_t step = isAscending ? step_ - 1 : steps - step_;
    IdRange rest = ids_;
    if (isAscending && step > 0)
        rest.first = std::max(rest.first, FirstIdOf(firstSegment_ + step - 1));
    if (!isAscending && step < steps - 1)
        rest.last = std::min(rest.last, std::min(FirstIdOf(firstSegment_ + step), header_.EndId()) - 1);
    return rest;
}

void Candidates::AddOutside(IdRange range, std::vector<IdRange> &ranges) const {
    range = {std::max(range.first, ids_.first), std::min(range.last, ids_.last)};
    if (!IsEmpty(range))
        ranges.push_back(range);
}

void Candidates::AddSegment(int64_t segment, bool isAscending, std::vector<IdRange> &ranges) {
    const int64_t base = FirstIdOf(segment);
    Bitmap all;
    all.fill(~uint64_t{0});
    const Bitmap blocks = Evaluate(need_, segment, all);
    const size_t start = ranges.size();
    for (size_t block = 0; block < blocks.size() * 64; ++block) {
        if (blocks[block / 64] == 0) {
            block |= 63;
            continue;
        }
        if ((blocks[block / 64] >> (block % 64) & 1) == 0)
            continue;
        const int64_t first = base + static_cast<int64_t>(block) * kIdsPerBlock;
        const IdRange range = {std::max(first, ids_.first), std::min(first + kIdsPerBlock - 1, ids_.last)};
        if (IsEmpty(range))
            continue;
        if (ranges.size() > start && range.first - ranges.back().last <= kSmallGap + 1)
            ranges.back().last = range.last;
        else
            ranges.push_back(range);
    }
    if (!isAscending)
        std::reverse(ranges.begin() + static_cast<std::ptrdiff_t>(start), ranges.end());
}

// The blocks of `among` that may have what is needed.
Candidates::Bitmap Candidates::Evaluate(const Need &need, int64_t segment, const Bitmap &among) {
    switch (need.kind) {
    case Need::Kind::kNothing:
        return among;
    case Need::Kind::kBits:
        return EvaluateBits(need, segment, among);
    case Need::Kind::kTimes:
        return EvaluateTimes(need, segment, among);
    case Need::Kind::kAll: {
        Bitmap all = among;
        for (const Need &part : need.parts)
            all = Evaluate(part, segment, all);
        return all;
    }
    case Need::Kind::kAny:
        break;
    }
    Bitmap any{};
    for (const Need &part : need.parts) {
        const Bitmap blocks = Evaluate(part, segment, among);
        for (size_t word = 0; word < any.size(); ++word)
            any[word] |= blocks[word];
    }
    return any;
}

Candidates::Bitmap Candidates::EvaluateBits(const Need &need, int64_t segment, Bitmap among) {
    std::array<Slice, kPiecesPerSegment> slices;
    for (const uint16_t bit : need.bits) {
        if (std::all_of(among.begin(), among.end(), [](uint64_t word) { return word == 0; }))
            break;
        const int pieces = file_.ReadSlices(header_, segment, bit, slices);
        if (pieces < 0) {
            isGood_ = false;
            return {};
        }
        for (size_t word = 0; word < among.size(); ++word) {
            const size_t piece = word / kWordsPerSlice;
            // Rows behind the last piece are no concern of this step.
            among[word] &=
                piece < static_cast<size_t>(pieces) ? slices[piece].Word(word % kWordsPerSlice) : 0;
        }
    }
    return among;
}

bool Candidates::ReadZonesOf(int64_t segment) {
    if (zonesOf_ == segment)
        return true;
    zonePieceCount_ = file_.ReadZones(header_, segment, zones_);
    zonesOf_ = zonePieceCount_ >= 0 ? segment : -1;
    return zonePieceCount_ >= 0;
}

Candidates::Bitmap Candidates::EvaluateTimes(const Need &need, int64_t segment, Bitmap among) {
    if (!ReadZonesOf(segment)) {
        isGood_ = false;
        return {};
    }
    const auto column = static_cast<size_t>(need.column);
    for (size_t word = 0; word < among.size(); ++word) {
        const size_t piece = word / kZonesPerPiece;
        const bool isPossible = piece < static_cast<size_t>(zonePieceCount_) &&
                                zones_[piece].zones[word % kZonesPerPiece][column].Touches(need.times);
        among[word] = isPossible ? among[word] : 0;
    }
    return among;
}

int64_t CountIds(const std::vector<IdRange> &ranges, int64_t most) {
    int64_t count = 0;
    for (const IdRange &range : ranges) {
        // The difference of two ids may be larger than an id.
        const uint64_t ids = static_cast<uint64_t>(range.last) - static_cast<uint64_t>(range.first);
        if (ids >= static_cast<uint64_t>(most - count))
            return most;
        count += static_cast<int64_t>(ids) + 1;
    }
    return count;
}

} // namespace kelo::platform
