#pragma once

#include <sys/stat.h>

#include <array>
#include <cstdint>
#include <optional>
#include <span>
#include <string>

#include "common/unique_fd.h"
#include "skip_index/piece.h"

namespace kelo::platform {

// The newest row up to an id, remembered to see later that the database still is the one that was read: rows
// may be deleted since, but none can come.
struct RowSample {
    int64_t upTo;
    int64_t id; // the smallest number if there was no row
    uint64_t hash;

    bool operator==(const RowSample &) const = default;
};

// The head of an index file. docs/skip-index.md describes the format.
struct IndexHeader {
    static constexpr size_t kMostSamples = 16;
    static constexpr int64_t kMostPieces = 1 << 23; // 10^11 ids

    std::array<char, 16> magic;
    uint32_t version;
    uint32_t byteOrder;
    uint64_t fileNumber; // random
    uint64_t inode;      // of the database, as the next two
    int64_t birthSec;
    uint32_t birthNsec;
    uint32_t sampleCount;
    int64_t basePiece;  // the piece that the file begins with: the first of a segment
    int64_t pieceCount; // pieces that are complete in the file
    int64_t livePiece;  // the first one that has rows, the first of a segment: those before it were dropped
    std::array<RowSample, kMostSamples> samples;
    uint64_t checksum;

    // The smallest id that the index knows, and the smallest that it does not know yet.
    int64_t FirstId() const { return livePiece * kIdsPerPiece; }
    int64_t EndId() const { return (basePiece + pieceCount) * kIdsPerPiece; }
};

// The file behind an open database.
struct DatabaseIdentity {
    uint64_t inode;
    int64_t birthSec;
    uint32_t birthNsec;
    uid_t owner;
    gid_t group;
    mode_t mode;
};
std::optional<DatabaseIdentity> IdentityOf(const std::string &dbPath);

// Path of the index of a database.
std::string IndexPathOf(const std::string &dbPath);

// The index file of a database. A file that somebody else may have put there is not opened: it must be a
// regular file that root or the owner of the database owns, and nobody may write it who may not write the
// database. Links are not followed.
class IndexFile {
public:
    enum class Access { kRead, kWrite };

    // Nothing if there is no such file or it is not trusted; errno says why (EPERM: not trusted).
    static std::optional<IndexFile> Open(const std::string &dbPath, const DatabaseIdentity &database,
                                         Access access);
    // Makes an empty file, with owner and mode of the database. Nothing if there is one already.
    static std::optional<IndexFile> Create(const std::string &dbPath, const DatabaseIdentity &database);

    // Excludes other writers until the object ends. False if there is one, or if the file has lost its name.
    bool Lock() const;
    // Removes the name of a locked file.
    void Unlink() const;

    enum class State {
        kNew,     // its head was never written
        kGood,    // in itself; whether it fits the database is another matter
        kForeign, // of another version, or of another machine
        kDamaged,
    };
    // Reads the head.
    State ReadHeader(IndexHeader &header) const;

    // Reads the slices of bit `gram` of the pieces of a segment that are complete: returns how many, up to
    // kPiecesPerSegment; -1 if the file is damaged or has changed meanwhile.
    int ReadSlices(const IndexHeader &header, int64_t segment, size_t gram,
                   std::span<Slice, kPiecesPerSegment> slices) const;

    // The same for the zones of those pieces.
    int ReadZones(const IndexHeader &header, int64_t segment,
                  std::span<ZoneMap, kPiecesPerSegment> zones) const;

    // Write to the file. False on failure (errno), which leaves what was published before.
    bool Write(const void *bytes, size_t size, int64_t offset) const;
    // The header is complete but for its check sum.
    bool Publish(IndexHeader &header) const;
    // Takes off what is behind the published pieces.
    bool Cut(const IndexHeader &header) const;
    // Gives the disk space of the segments before `segment` back.
    bool Drop(int64_t segment) const;

    // Whether the file system has room for so many bytes, and then still for others.
    bool HasRoomFor(int64_t bytes) const;

    // Bytes that the file takes on its volume.
    int64_t DiskBytes() const;

private:
    template <typename Part>
    int64_t ReadParts(const IndexHeader &header, int64_t segment, size_t offset,
                      std::span<Part, kPiecesPerSegment> parts) const;
    IndexFile(std::string path, UniqueFd file) : path_(std::move(path)), file_(std::move(file)) {}

    std::string path_;
    UniqueFd file_;
};

// Where things are in the file. Segments are counted from the one that the file begins with. A segment has
// the slices of its pieces for gram 0, 1 and so on, and then their zones. The pieces of the segment that is
// not complete yet are in the place of the one after it, each with its slices and its zones.
inline constexpr size_t kZonesAt = kGramBits * sizeof(Slice); // in a piece
int64_t OffsetOfSegment(int64_t segment);
int64_t OffsetOfLoosePiece(int64_t segment, int64_t piece);

} // namespace kelo::platform
