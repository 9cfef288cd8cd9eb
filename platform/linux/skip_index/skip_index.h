#pragma once

#include <sqlite3.h>

#include <optional>
#include <string>

#include "skip_index/database_state.h"
#include "skip_index/index_file.h"

namespace kelo::platform {

// Whether the environment variable KELO_SKIP_INDEX is "off": all statements run as they are then.
bool IsSwitchedOff();

// What KELODBSkipIndexLag of this thread returns.
extern thread_local int64_t lastLag;

// The index of an open database, as it was when it was opened.
//
// It knows rows that were committed before; those that came after have ids beyond the ones that it knows. So
// it fits every snapshot of the database that begins after it was opened, and no older one: a row that an
// older snapshot still has may have been deleted before the index saw it.
class SkipIndex {
public:
    // Nothing without a good index, or if it is switched off.
    static std::optional<SkipIndex> Open(sqlite3 *db);

    // Whether it is the index of the database as this is now, whose table is an indexable one. Call it in the
    // transaction that reads.
    bool Fits(sqlite3 *db) const { return FitsDatabase(db, file_, header_, identity_); }
    // Throws it away, because reading found it damaged.
    void Discard() const;

    const IndexFile &File() const { return file_; }
    const IndexHeader &Header() const { return header_; }

private:
    SkipIndex(std::string dbPath, const DatabaseIdentity &identity, IndexFile file, const IndexHeader &header)
        : dbPath_(std::move(dbPath)), identity_(identity), file_(std::move(file)), header_(header) {}

    std::string dbPath_;
    DatabaseIdentity identity_;
    IndexFile file_;
    IndexHeader header_;
};

} // namespace kelo::platform
