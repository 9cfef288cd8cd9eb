#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "skip_index/index_file.h"
#include "skip_index/search_text.h"

namespace kelo::platform {

// The ids that may have a row for which a condition is true, as ranges: what the index cannot rule out and
// what it does not know.
class Candidates {
public:
    // All are references, which must outlive the object. `ids` bounds the ranges.
    Candidates(const IndexFile &file, const IndexHeader &header, const Need &need, const IdRange &ids);

    // Steps through the whole range of ids, from its smaller or its greater end. Appends the ranges of the
    // next step to `ranges`, in the order of the steps; a segment may have none. Returns false after the last
    // step.
    bool Next(bool isAscending, std::vector<IdRange> &ranges);

    // All ids of the last step and of those that come after it.
    IdRange Rest(bool isAscending) const;

    // False when the index turned out to be damaged or changed: the ranges are worth nothing then.
    bool IsGood() const { return isGood_; }

private:
    using Bitmap = std::array<uint64_t, kWordsPerSlice * kPiecesPerSegment>;

    int64_t FirstIdOf(int64_t segment) const;
    void AddOutside(IdRange range, std::vector<IdRange> &ranges) const;
    void AddSegment(int64_t segment, bool isAscending, std::vector<IdRange> &ranges);
    Bitmap Evaluate(const Need &need, int64_t segment, const Bitmap &among);
    Bitmap EvaluateBits(const Need &need, int64_t segment, Bitmap among);
    Bitmap EvaluateTimes(const Need &need, int64_t segment, Bitmap among);
    bool ReadZonesOf(int64_t segment);

    const IndexFile &file_;
    const IndexHeader &header_;
    const Need &need_;
    IdRange ids_;
    int64_t firstSegment_; // of those that the range of ids touches, in the file
    int64_t endSegment_;
    int64_t step_ = 0; // the next one
    std::array<ZoneMap, kPiecesPerSegment> zones_{};
    int64_t zonesOf_ = -1;   // the segment
    int zonePieceCount_ = 0; // that it has
    bool isGood_ = true;
};

// Number of ids in the ranges, up to `most`.
int64_t CountIds(const std::vector<IdRange> &ranges, int64_t most);

} // namespace kelo::platform
