#include "board.h"

#include <sys/mman.h>

#include <cerrno>
#include <chrono>
#include <new>
#include <system_error>

namespace kelo::stress {

Board &Board::Make() {
    void *memory = mmap(nullptr, sizeof(Board), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    if (memory == MAP_FAILED)
        throw std::system_error(errno, std::generic_category(), "no shared memory");
    return *new (memory) Board;
}

const char *NameOf(int kind) {
    static constexpr std::array<const char *, kKinds> kNames = {"events added",
                                                                "event lists read",
                                                                "accounting flushes",
                                                                "histograms read",
                                                                "batches received",
                                                                "batches of syslog-ng",
                                                                "texts parsed",
                                                                "selections",
                                                                "counts",
                                                                "deletions",
                                                                "checks",
                                                                "quarantines",
                                                                "write-ahead logs emptied",
                                                                "archives",
                                                                "copies",
                                                                "queries of the program"};
    return kNames[static_cast<size_t>(kind)];
}

int64_t NowMs() {
    using namespace std::chrono;
    return duration_cast<milliseconds>(steady_clock::now().time_since_epoch()).count();
}

Quiet::Quiet(const Board &board, const Site &site, Database database)
    : board_(board), path_(site.PathOf(database)), database_(database), inode_(InodeOf(path_)),
      risk_(board.risk[database]), archiving_(board.archiving) {}

bool Quiet::WasSafe() const {
    return risk_ % 2 == 0 && board_.risk[database_] == risk_;
}

bool Quiet::WasSame() const {
    return WasSafe() && inode_ != 0 && InodeOf(path_) == inode_ && archiving_ % 2 == 0 &&
           board_.archiving == archiving_;
}

} // namespace kelo::stress
