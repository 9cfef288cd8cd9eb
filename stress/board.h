#pragma once

#include <array>
#include <atomic>
#include <cstdint>

#include "site.h"

namespace kelo::stress {

enum Kind {
    kAddEvent,
    kListEvents,
    kFlush,
    kReadHistogram,
    kStore,
    kInsert,
    kParse,
    kSelect,
    kCount,
    kDelete,
    kCheck,
    kQuarantine,
    kEmptyWal,
    kArchive,
    kCopy,
    kQuery,
    kKinds
};

// What all processes see: memory that they share.
struct Board {
    static constexpr int kPlaces = 32;
    struct Place {                      // of one worker
        std::atomic<int64_t> since = 0; // when its operation began, milliseconds; 0 between operations
        std::atomic<int> kind = 0;
        std::atomic<uint32_t> number = 0; // of its token
    };
    std::array<Place, kPlaces> places;
    std::array<std::atomic<uint64_t>, kKinds> done{};   // operations that succeeded
    std::array<std::atomic<uint64_t>, kKinds> failed{}; // that answered with a failure
    // Odd while a damaged write-ahead log may make a database lose what it has promised.
    std::array<std::atomic<uint32_t>, kDatabases> risk{};
    // Odd while archived records are being removed.
    std::atomic<uint32_t> archiving = 0;
    std::atomic<bool> isOver = false;

    // Throws std::system_error. It is never freed.
    static Board &Make();
};

const char *NameOf(int kind);

// Milliseconds of a clock that only goes forward.
int64_t NowMs();

// A look at a database whose result is known only as long as its file stays the same and loses nothing.
class Quiet {
public:
    Quiet(const Board &board, const Site &site, Database database);
    // Whether the write-ahead log was sound all the time.
    bool WasSafe() const;
    // Whether it also was the same file, from which nobody removed archived records.
    bool WasSame() const;

private:
    const Board &board_;
    const std::string path_;
    const Database database_;
    const ino_t inode_;
    const uint32_t risk_;
    const uint32_t archiving_;
};

} // namespace kelo::stress
