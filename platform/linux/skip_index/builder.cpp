#include "skip_index/builder.h"

#include <sys/random.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "skip_index/database_state.h"
#include "skip_index/piece_reader.h"
#include "skip_index/transaction.h"

namespace kelo::platform {
namespace {

using std::chrono::steady_clock;

// Of the database's size: 1/4, and two segments of a small one. Dense ids of log messages take 1/16.
constexpr int64_t kLargestShare = 4;
constexpr int64_t kSamplesPerPiece = 8;
constexpr int64_t kSmallIndex = 2 * kSegmentBytes;

int64_t NumberOf(sqlite3 *db, const char *sql, int64_t otherwise) {
    Query query(db, sql);
    return query.Step() && sqlite3_column_type(query.Get(), 0) != SQLITE_NULL
               ? sqlite3_column_int64(query.Get(), 0)
               : otherwise;
}

// The first piece of the segment that an id is in.
int64_t SegmentPieceOf(int64_t id) {
    return std::max<int64_t>(id, 0) / kIdsPerSegment * kPiecesPerSegment;
}

IndexHeader NewHeader(const DatabaseIdentity &identity, int64_t firstPiece) {
    IndexHeader header;
    std::memset(&header, 0, sizeof header); // the gaps too
    header.inode = identity.inode;
    header.birthSec = identity.birthSec;
    header.birthNsec = identity.birthNsec;
    header.basePiece = header.livePiece = firstPiece;
    if (getrandom(&header.fileNumber, sizeof header.fileNumber, 0) != sizeof header.fileNumber)
        header.fileNumber = static_cast<uint64_t>(steady_clock::now().time_since_epoch().count());
    return header;
}

// Keeps the newest samples and ever fewer of the older ones.
void AddSample(IndexHeader &header, const RowSample &sample) {
    auto *end = header.samples.begin() + header.sampleCount;
    if (header.sampleCount != 0 && std::prev(end)->upTo >= sample.upTo)
        return;
    if (header.sampleCount == header.samples.size()) {
        const auto loss = [&](const RowSample &at) {
            return static_cast<double>((&at)[1].upTo - (&at)[-1].upTo) /
                   static_cast<double>(sample.upTo - at.upTo);
        };
        auto *least = std::min_element(
            header.samples.begin() + 1, end - 1,
            [&](const RowSample &one, const RowSample &other) { return loss(one) < loss(other); });
        std::copy(least + 1, end, least);
        --header.sampleCount;
    }
    header.samples[header.sampleCount++] = sample;
}

constexpr char kDamaged[] = "it is damaged";
void Report(const std::string &dbPath, const char *reason) {
    syslog(LOG_WARNING, "skip index %s: %s; it is removed and built again", IndexPathOf(dbPath).c_str(),
           reason);
}

class Builder {
public:
    Builder(sqlite3 *db, IndexFile file, const IndexHeader &header)
        : db_(db), file_(std::move(file)), header_(header), newest_(LargestIdEver(db)),
          databaseBytes_(NumberOf(db, "PRAGMA page_count", 0) * NumberOf(db, "PRAGMA page_size", 0)),
          reader_(db) {}

    // Nothing if what is built already turned out to be damaged.
    std::optional<BuildResult> Run(steady_clock::time_point deadline);
    const IndexFile &File() const { return file_; }

private:
    bool HasPiece() const { return NextPiece() < newest_ / kIdsPerPiece; }
    int64_t NextPiece() const { return header_.basePiece + Published() + Fresh(); }
    int64_t Published() const { return header_.pieceCount; }
    int64_t Fresh() const { return static_cast<int64_t>(loose_.size()) - looseOnDisk_; }
    BuildResult Refusal() const;
    bool ReadLoose();
    bool BuildPiece();
    bool TakeSamples(int64_t piece);
    bool WriteSegment();
    bool WriteLoose();
    bool Publish();
    void DropDeadSegments();

    sqlite3 *db_;
    IndexFile file_;
    IndexHeader header_;
    int64_t newest_;
    int64_t databaseBytes_;
    PieceReader reader_;
    std::vector<RowSample> samples_; // of the pieces that are not published
    std::vector<BuiltPiece> loose_;  // pieces of the segment that is not complete
    int64_t looseOnDisk_ = 0;
};

// Why no further segment is built; kComplete if it is.
BuildResult Builder::Refusal() const {
    const int64_t bytes = (NextPiece() - header_.livePiece) * static_cast<int64_t>(kPieceBytes);
    if (NextPiece() - header_.basePiece > IndexHeader::kMostPieces ||
        bytes > kSmallIndex + databaseBytes_ / kLargestShare)
        return BuildResult::kTooSparse;
    return file_.HasRoomFor(2 * static_cast<int64_t>(kSegmentBytes)) ? BuildResult::kComplete
                                                                     : BuildResult::kNoRoom;
}

bool Builder::ReadLoose() {
    looseOnDisk_ = header_.pieceCount % kPiecesPerSegment;
    for (int64_t i = 0; i < looseOnDisk_; ++i)
        loose_.push_back({std::make_unique<Slice[]>(kGramBits), {}});
    std::array<Slice, kPiecesPerSegment> slices;
    for (size_t gram = 0; looseOnDisk_ != 0 && gram < kGramBits; ++gram) {
        if (file_.ReadSlices(header_, header_.pieceCount / kPiecesPerSegment, gram, slices) != looseOnDisk_)
            return false;
        for (size_t i = 0; i < loose_.size(); ++i)
            loose_[i].slices[gram] = slices[i];
    }
    std::array<ZoneMap, kPiecesPerSegment> zones;
    if (looseOnDisk_ != 0 &&
        file_.ReadZones(header_, header_.pieceCount / kPiecesPerSegment, zones) != looseOnDisk_)
        return false;
    for (size_t i = 0; i < loose_.size(); ++i)
        loose_[i].zones = zones[i];
    return true;
}

bool Builder::BuildPiece() {
    const Transaction transaction(db_, "BEGIN"); // the samples are those of the rows that are indexed
    if (!transaction.IsOpen())
        return false;
    const int64_t piece = NextPiece();
    const Piece *rows = reader_.Read(piece);
    if (rows == nullptr || !TakeSamples(piece))
        return false;
    loose_.push_back(rows->Build(header_.fileNumber, piece));
    return true;
}

bool Builder::TakeSamples(int64_t piece) {
    RowSampler sampler(db_);
    for (int64_t step = 1; step <= kSamplesPerPiece; ++step) {
        const auto sample = sampler.UpTo(piece * kIdsPerPiece + step * kIdsPerPiece / kSamplesPerPiece - 1);
        if (!sample)
            return false;
        samples_.push_back(*sample);
    }
    return true;
}

bool Builder::Publish() {
    header_.pieceCount += Fresh();
    looseOnDisk_ = static_cast<int64_t>(loose_.size());
    for (const RowSample &sample : samples_)
        AddSample(header_, sample);
    samples_.clear();
    return file_.Publish(header_);
}

bool Builder::WriteSegment() {
    const int64_t segment = header_.pieceCount / kPiecesPerSegment;
    const auto slices = std::make_unique<Slice[]>(kGramBits * kPiecesPerSegment);
    for (size_t gram = 0; gram < kGramBits; ++gram)
        for (size_t piece = 0; piece < loose_.size(); ++piece)
            slices[gram * kPiecesPerSegment + piece] = loose_[piece].slices[gram];
    std::array<ZoneMap, kPiecesPerSegment> zones;
    for (size_t piece = 0; piece < loose_.size(); ++piece)
        zones[piece] = loose_[piece].zones;
    constexpr size_t kSliceBytes = kZonesAt * kPiecesPerSegment;
    if (!file_.Write(slices.get(), kSliceBytes, OffsetOfSegment(segment)) ||
        !file_.Write(zones.data(), sizeof zones,
                     OffsetOfSegment(segment) + static_cast<int64_t>(kSliceBytes)) ||
        !Publish())
        return false;
    loose_.clear();
    looseOnDisk_ = 0;
    return file_.Cut(header_);
}

bool Builder::WriteLoose() {
    if (Fresh() == 0)
        return true;
    const int64_t segment = header_.pieceCount / kPiecesPerSegment;
    for (int64_t i = looseOnDisk_; i < static_cast<int64_t>(loose_.size()); ++i) {
        const BuiltPiece &piece = loose_[static_cast<size_t>(i)];
        const int64_t offset = OffsetOfLoosePiece(segment, i);
        if (!file_.Write(piece.slices.get(), kZonesAt, offset) ||
            !file_.Write(&piece.zones, sizeof piece.zones, offset + static_cast<int64_t>(kZonesAt)))
            return false;
    }
    return Publish();
}

// Rows are archived and deleted from the oldest end.
void Builder::DropDeadSegments() {
    const int64_t first = SegmentPieceOf(NumberOf(db_, "SELECT min(id) FROM main.logs", 0));
    const int64_t live =
        std::min(first, header_.basePiece + header_.pieceCount / kPiecesPerSegment * kPiecesPerSegment);
    if (live <= header_.livePiece)
        return;
    header_.livePiece = live;
    if (file_.Publish(header_))
        file_.Drop((live - header_.basePiece) / kPiecesPerSegment);
}

std::optional<BuildResult> Builder::Run(steady_clock::time_point deadline) {
    DropDeadSegments();
    if (!HasPiece())
        return BuildResult::kComplete;
    if (!ReadLoose())
        return std::nullopt;
    BuildResult result = BuildResult::kComplete;
    bool isGood = true;
    while (isGood && HasPiece() && result == BuildResult::kComplete) {
        result = steady_clock::now() >= deadline ? BuildResult::kMore : Refusal();
        if (result != BuildResult::kComplete)
            break;
        isGood = BuildPiece() && (loose_.size() < kPiecesPerSegment || WriteSegment());
    }
    if (isGood && WriteLoose())
        return result;
    const int error = errno;
    file_.Cut(header_);
    errno = error;
    return error == ENOSPC || error == EDQUOT ? BuildResult::kNoRoom : BuildResult::kFailed;
}

struct LockedIndex {
    IndexFile file;
    IndexHeader header;
};

// The index of the database, locked and good, or a new one. Otherwise `failure` says why.
std::optional<LockedIndex> TakeIndex(sqlite3 *db, const std::string &path, BuildResult &failure) {
    const auto identity = IdentityOf(path);
    failure = BuildResult::kNotAllowed;
    if (!identity)
        return std::nullopt;
    const IndexHeader fresh =
        NewHeader(*identity, SegmentPieceOf(NumberOf(db, "SELECT min(id) FROM main.logs", 0)));
    auto file = IndexFile::Open(path, *identity, IndexFile::Access::kWrite);
    if (!file && errno == ENOENT)
        file = IndexFile::Create(path, *identity);
    if (!file) {
        if (errno == EEXIST) // another one was faster
            failure = BuildResult::kBusy;
        return std::nullopt;
    }
    failure = BuildResult::kBusy;
    if (!file->Lock())
        return std::nullopt;
    IndexHeader header;
    const IndexFile::State state = file->ReadHeader(header);
    if (state == IndexFile::State::kGood && FitsDatabase(db, *file, header, *identity))
        return LockedIndex{std::move(*file), header};
    if (state != IndexFile::State::kNew) {
        Report(path, state == IndexFile::State::kGood      ? "it is that of another database"
                     : state == IndexFile::State::kForeign ? "it has another version"
                                                           : kDamaged);
        file->Unlink();
        file = IndexFile::Create(path, *identity);
        if (!file || !file->Lock())
            return std::nullopt;
    }
    return LockedIndex{std::move(*file), fresh};
}

} // namespace

BuildResult BuildIndex(sqlite3 *db, steady_clock::time_point deadline) {
    const std::string path = FileOf(db);
    if (path.empty() || sqlite3_txn_state(db, "main") != SQLITE_TXN_NONE)
        return BuildResult::kFailed;
    if (!HasIndexableTable(db))
        return BuildResult::kNoTable;
    if (LargestIdEver(db) < kIdsPerPiece && access(IndexPathOf(path).c_str(), F_OK) != 0)
        return BuildResult::kComplete;
    for (int attempt = 0; attempt < 2; ++attempt) {
        BuildResult failure;
        auto index = TakeIndex(db, path, failure);
        if (!index)
            return failure;
        Builder builder(db, std::move(index->file), index->header);
        if (const auto result = builder.Run(deadline))
            return *result;
        Report(path, kDamaged);
        builder.File().Unlink();
    }
    errno = EIO;
    return BuildResult::kFailed;
}

void DiscardIndex(const std::string &dbPath, const DatabaseIdentity &database, const IndexHeader &header) {
    const auto file = IndexFile::Open(dbPath, database, IndexFile::Access::kWrite);
    IndexHeader now;
    if (!file || !file->Lock() || file->ReadHeader(now) != IndexFile::State::kGood ||
        std::memcmp(&now, &header, sizeof now) != 0)
        return;
    Report(dbPath, kDamaged);
    file->Unlink();
}

} // namespace kelo::platform
