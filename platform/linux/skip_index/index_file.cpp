#include "skip_index/index_file.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <limits>

namespace kelo::platform {
namespace {

constexpr std::array<char, 16> kMagic = {'k', 'e', 'l', 'o', ' ', 's', 'k', 'i',
                                         'p', ' ', 'i', 'n', 'd', 'e', 'x', '\n'};
constexpr uint32_t kVersion = 4;
constexpr uint32_t kByteOrder = 0x01020304;
constexpr int64_t kHeaderBytes = 4096;
constexpr int64_t kLeastFreeShare = 20; // of a volume: 1/20 stays free
constexpr mode_t kAccessBits = 0666;

bool ReadAll(int fd, void *bytes, size_t size, int64_t offset) {
    return pread(fd, bytes, size, offset) == static_cast<ssize_t>(size);
}

uint64_t ChecksumOf(const IndexHeader &header) {
    return HashOf({reinterpret_cast<const char *>(&header), offsetof(IndexHeader, checksum)}, kVersion);
}

int64_t PublishedSize(const IndexHeader &header) {
    const int64_t complete = header.pieceCount / kPiecesPerSegment;
    const int64_t loose = header.pieceCount % kPiecesPerSegment;
    return loose != 0 ? OffsetOfLoosePiece(complete, loose) : OffsetOfSegment(complete);
}

// Numbers with which nothing can be reckoned wrong.
bool IsSensible(const IndexHeader &header) {
    constexpr int64_t kEndPiece = std::numeric_limits<int64_t>::max() / kIdsPerPiece;
    return header.sampleCount <= header.samples.size() && header.pieceCount >= 0 &&
           header.pieceCount <= IndexHeader::kMostPieces + kPiecesPerSegment && header.basePiece >= 0 &&
           header.basePiece <= kEndPiece - header.pieceCount && header.livePiece >= header.basePiece &&
           header.livePiece <= header.basePiece + header.pieceCount &&
           header.basePiece % kPiecesPerSegment == 0 && header.livePiece % kPiecesPerSegment == 0;
}

bool IsTrusted(const struct stat &file, const DatabaseIdentity &database) {
    const bool isOwned = file.st_uid == 0 || file.st_uid == database.owner;
    const mode_t writers = file.st_mode & (S_IWGRP | S_IWOTH);
    const bool isNarrow =
        (writers & ~database.mode) == 0 && ((writers & S_IWGRP) == 0 || file.st_gid == database.group);
    return S_ISREG(file.st_mode) && isOwned && isNarrow;
}

} // namespace

std::optional<DatabaseIdentity> IdentityOf(const std::string &dbPath) {
    struct statx file {};
    if (statx(AT_FDCWD, dbPath.c_str(), 0, STATX_BASIC_STATS | STATX_BTIME, &file) != 0)
        return std::nullopt;
    return DatabaseIdentity{file.stx_ino, file.stx_btime.tv_sec, file.stx_btime.tv_nsec,
                            file.stx_uid, file.stx_gid,          file.stx_mode};
}

std::string IndexPathOf(const std::string &dbPath) {
    return dbPath + "-skip";
}

int64_t OffsetOfSegment(int64_t segment) {
    return kHeaderBytes + segment * static_cast<int64_t>(kSegmentBytes);
}

int64_t OffsetOfLoosePiece(int64_t segment, int64_t piece) {
    return OffsetOfSegment(segment + 1) + piece * static_cast<int64_t>(kPieceBytes);
}

std::optional<IndexFile> IndexFile::Open(const std::string &dbPath, const DatabaseIdentity &database,
                                         Access access) {
    std::string path = IndexPathOf(dbPath);
    const int mode = access == Access::kWrite ? O_RDWR : O_RDONLY;
    UniqueFd file(open(path.c_str(), mode | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    struct stat info {};
    if (!file || fstat(file.Get(), &info) != 0)
        return std::nullopt;
    if (!IsTrusted(info, database)) {
        errno = EPERM;
        return std::nullopt;
    }
    return IndexFile(std::move(path), std::move(file));
}

std::optional<IndexFile> IndexFile::Create(const std::string &dbPath, const DatabaseIdentity &database) {
    std::string path = IndexPathOf(dbPath);
    UniqueFd file(open(path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR));
    if (!file)
        return std::nullopt;
    // The mode comes last: until then nobody else can open it.
    struct stat info {};
    const bool isDone = fstat(file.Get(), &info) == 0 &&
                        ((info.st_uid == database.owner && info.st_gid == database.group) ||
                         fchown(file.Get(), database.owner, database.group) == 0 || geteuid() != 0) &&
                        fchmod(file.Get(), database.mode & kAccessBits) == 0;
    if (!isDone || fstat(file.Get(), &info) != 0 || !IsTrusted(info, database)) {
        unlink(path.c_str());
        return std::nullopt;
    }
    return IndexFile(std::move(path), std::move(file));
}

bool IndexFile::Lock() const {
    struct stat file {};
    struct stat named {};
    return flock(file_.Get(), LOCK_EX | LOCK_NB) == 0 && fstat(file_.Get(), &file) == 0 &&
           lstat(path_.c_str(), &named) == 0 && file.st_dev == named.st_dev && file.st_ino == named.st_ino;
}

void IndexFile::Unlink() const {
    unlink(path_.c_str());
}

IndexFile::State IndexFile::ReadHeader(IndexHeader &header) const {
    struct stat info {};
    if (fstat(file_.Get(), &info) != 0)
        return State::kDamaged;
    if (info.st_size == 0)
        return State::kNew;
    if (!ReadAll(file_.Get(), &header, sizeof header, 0))
        return State::kDamaged;
    // Room that was made before the head was written.
    if (header.checksum == 0 && header.magic == std::array<char, 16>{})
        return State::kNew;
    if (header.magic == kMagic && (header.version != kVersion || header.byteOrder != kByteOrder))
        return State::kForeign;
    if (header.magic != kMagic || header.checksum != ChecksumOf(header) || !IsSensible(header))
        return State::kDamaged;
    return info.st_size >= PublishedSize(header) ? State::kGood : State::kDamaged;
}

// Reads the parts at an offset of each complete piece of a segment. Returns how many, -1 on failure.
template <typename Part>
int64_t IndexFile::ReadParts(const IndexHeader &header, int64_t segment, size_t offset,
                             std::span<Part, kPiecesPerSegment> parts) const {
    const int64_t count = std::min(header.pieceCount - segment * kPiecesPerSegment, kPiecesPerSegment);
    if (count == kPiecesPerSegment)
        return ReadAll(file_.Get(), parts.data(), parts.size_bytes(),
                       OffsetOfSegment(segment) + static_cast<int64_t>(offset) * kPiecesPerSegment)
                   ? count
                   : -1;
    for (int64_t piece = 0; piece < count; ++piece) {
        if (!ReadAll(file_.Get(), &parts[static_cast<size_t>(piece)], sizeof(Part),
                     OffsetOfLoosePiece(segment, piece) + static_cast<int64_t>(offset)))
            return -1;
    }
    return count;
}

int IndexFile::ReadSlices(const IndexHeader &header, int64_t segment, size_t gram,
                          std::span<Slice, kPiecesPerSegment> slices) const {
    const int64_t count = ReadParts(header, segment, gram * sizeof(Slice), slices);
    const int64_t first = header.basePiece + segment * kPiecesPerSegment;
    for (int64_t piece = 0; piece < count; ++piece) {
        const Slice &slice = slices[static_cast<size_t>(piece)];
        if (slice.checksum != kelo::platform::ChecksumOf(slice, header.fileNumber, first + piece, gram))
            return -1;
    }
    return static_cast<int>(count);
}

int IndexFile::ReadZones(const IndexHeader &header, int64_t segment,
                         std::span<ZoneMap, kPiecesPerSegment> zones) const {
    const int64_t count = ReadParts(header, segment, kZonesAt, zones);
    const int64_t first = header.basePiece + segment * kPiecesPerSegment;
    for (int64_t piece = 0; piece < count; ++piece) {
        const ZoneMap &map = zones[static_cast<size_t>(piece)];
        if (map.checksum != kelo::platform::ChecksumOf(map, header.fileNumber, first + piece))
            return -1;
    }
    return static_cast<int>(count);
}

bool IndexFile::Write(const void *bytes, size_t size, int64_t offset) const {
    const auto *from = static_cast<const char *>(bytes);
    while (size > 0) {
        const ssize_t written = pwrite(file_.Get(), from, size, offset);
        if (written < 0 && errno == EINTR)
            continue;
        if (written <= 0)
            return false;
        from += written;
        offset += written;
        size -= static_cast<size_t>(written);
    }
    return true;
}

bool IndexFile::Publish(IndexHeader &header) const {
    header.magic = kMagic;
    header.version = kVersion;
    header.byteOrder = kByteOrder;
    header.checksum = ChecksumOf(header);
    return Write(&header, sizeof header, 0);
}

bool IndexFile::Cut(const IndexHeader &header) const {
    return ftruncate(file_.Get(), PublishedSize(header)) == 0;
}

bool IndexFile::Drop(int64_t segment) const {
    return fallocate(file_.Get(), FALLOC_FL_PUNCH_HOLE | FALLOC_FL_KEEP_SIZE, OffsetOfSegment(0),
                     OffsetOfSegment(segment) - OffsetOfSegment(0)) == 0;
}

bool IndexFile::HasRoomFor(int64_t bytes) const {
    struct statvfs volume {};
    if (fstatvfs(file_.Get(), &volume) != 0)
        return false;
    const auto blockBytes = static_cast<int64_t>(volume.f_frsize);
    const int64_t left = static_cast<int64_t>(volume.f_bavail) * blockBytes - bytes;
    return left >= static_cast<int64_t>(volume.f_blocks) * blockBytes / kLeastFreeShare;
}

int64_t IndexFile::DiskBytes() const {
    struct stat info {};
    return fstat(file_.Get(), &info) == 0 ? int64_t{info.st_blocks} * 512 : 0;
}

} // namespace kelo::platform
