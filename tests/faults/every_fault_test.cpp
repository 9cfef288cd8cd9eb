// Every operation against every fault: the N-th platform call, allocation, write or read fails, for N = 1, 2,
// 3, ... until none fails, once and from there on.

#include <limits>
#include <new>

#include "faults/allocation_faults.h"
#include "faults/file_faults.h"
#include "faults/operations.h"

namespace kelo::test {
namespace {

constexpr int kAlways = std::numeric_limits<int>::max();

// A way to make the `first`-th of some calls fail, `times` times.
struct FaultSource {
    const char *name;
    const char *fault; // as an outcome names it
    bool needsWrites;  // reached only by operations that write
    void (*start)(int first, int times);
    bool (*stop)();                  // ends it; whether something failed
    std::set<KELOFAILUREKIND> kinds; // that a program may read for it; empty: any

    friend void PrintTo(const FaultSource &source, std::ostream *out) { *out << source.name; }
};

template <FileFaults::Kind Kind>
void StartFileFaults(int first, int times) {
    FileFaults::Start(Kind, first, times);
}

using Kind = FileFaults::Kind;
const FaultSource kFaultSources[] = {
    {"PlatformCall", "", false, PlatformCalls::FailFrom, PlatformCalls::HasFailed, {}},
    {"Allocation",
     "allocation",
     false,
     AllocationFaults::Start,
     AllocationFaults::Stop,
     {KELO_FAILURE_MEMORY}},
    {"Write",
     "write",
     true,
     StartFileFaults<Kind::kWrite>,
     FileFaults::Stop,
     {KELO_FAILURE_IO, KELO_FAILURE_DAMAGED}},
    {"FullDisk",
     "full disk",
     true,
     StartFileFaults<Kind::kFull>,
     FileFaults::Stop,
     {KELO_FAILURE_FULL, KELO_FAILURE_IO}}, // SQLite loses the cause of some
    {"Read",
     "read",
     false,
     StartFileFaults<Kind::kRead>,
     FileFaults::Stop,
     {KELO_FAILURE_IO, KELO_FAILURE_DAMAGED}},
};

using Parameters = std::tuple<Operation, FaultSource>;

// Every operation with every source that it can meet.
std::vector<Parameters> Combinations() {
    std::vector<Parameters> combinations;
    for (const Operation &operation : Operations()) {
        for (const FaultSource &source : kFaultSources) {
            if (source.stop != AllocationFaults::Stop || AllocationFaults::IsSupported())
                combinations.emplace_back(operation, source);
        }
    }
    return combinations;
}

class EveryFault : public testing::TestWithParam<Parameters> {
protected:
    void SetUp() override {
        operation_.setUp(fixture_);
        fs::copy(fixture_.root.Path(), pristine_.Path(), fs::copy_options::recursive);
        RunWith(kAlways, 1); // what a process allocates or opens once is not the operation's
        openFiles_ = CountOpenFiles();
    }

    static size_t CountOpenFiles() {
        const fs::directory_iterator files("/proc/self/fd");
        return static_cast<size_t>(std::distance(begin(files), end(files)));
    }

    // The names of all files, without the companion files that SQLite keeps after a failure.
    std::set<std::string> FileNames() const {
        std::set<std::string> names;
        for (const auto &file : fs::recursive_directory_iterator(fixture_.root.Path()))
            names.insert(file.path());
        std::erase_if(names, [](const std::string &name) {
            return name.ends_with("-wal") || name.ends_with("-shm") || name.ends_with("-journal");
        });
        return names;
    }

    Outcome RunWith(int first, int times) {
        for (const auto &file : fs::directory_iterator(fixture_.root.Path()))
            fs::remove_all(file);
        fs::copy(pristine_.Path(), fixture_.root.Path(), fs::copy_options::recursive);
        fileNames_ = FileNames();
        fixture_.seen.clear();
        PlatformCalls::Reset();
        SyslogFailureClear();
        KELOFailureClear();
        SyslogCapture capture;
        Outcome outcome;
        source_.start(first, times);
        const int liveBlocks = AllocationFaults::LiveBlocks();
        try {
            outcome.result = operation_.run(fixture_);
        } catch (const std::bad_alloc &) {
            outcome.outOfMemory = true;
        }
        const bool hasFailed = source_.stop();
        leakedBlocks_ = AllocationFaults::LiveBlocks() - liveBlocks;
        if (hasFailed)
            outcome.fault = PlatformCalls::HasFailed() ? PlatformCalls::FailedFunction() : source_.fault;
        PlatformCalls::FailFrom(1, 0);
        outcome.kind = SyslogFailureGet()->kind;
        if (outcome.kind == KELO_FAILURE_NONE) // of an operation of the platform alone
            outcome.kind = KELOFailureGet()->kind;
        outcome.messages = capture.TakeTexts();
        return outcome;
    }

    // Runs with the fault and checks everything. Returns false when no fault was met, which ends a loop.
    bool MeetsFault(int first, int times) {
        const Outcome outcome = RunWith(first, times);
        EXPECT_TRUE(!outcome.outOfMemory || outcome.fault == "allocation");
        EXPECT_EQ(PlatformCalls::OpenHandles(), 0);
        EXPECT_EQ(leakedBlocks_, 0);
        EXPECT_EQ(CountOpenFiles(), openFiles_);
        EXPECT_TRUE(!operation_.keepsFiles || FileNames() == fileNames_);
        EXPECT_TRUE(fixture_.database.empty() || RunSql(fixture_.database, "PRAGMA integrity_check") == "ok");
        operation_.check(fixture_, outcome);
        ExpectReason(outcome);
        EXPECT_TRUE(!outcome.fault.empty() || outcome.IsDone()) << "failed without a fault";
        return !outcome.fault.empty();
    }

    // A program can read why an operation failed.
    void ExpectReason(const Outcome &outcome) const {
        if (outcome.IsDone() && outcome.messages.empty()) {
            EXPECT_EQ(outcome.kind, KELO_FAILURE_NONE);
        } else if (!outcome.IsDone() && !outcome.outOfMemory) {
            const auto &kinds = source_.kinds;
            // A double that fails in the test's own call of the platform has no reason.
            const bool isOwnCall = fixture_.database.empty() && outcome.fault.starts_with("TORVC");
            EXPECT_TRUE(isOwnCall || outcome.kind != KELO_FAILURE_NONE);
            EXPECT_TRUE(kinds.empty() || kinds.contains(outcome.kind))
                << outcome.kind << ": " << SyslogFailureGet()->text;
        }
    }

    const Operation operation_ = std::get<0>(GetParam());
    const FaultSource source_ = std::get<1>(GetParam());
    Fixture fixture_;

private:
    TempRoot pristine_; // the files before a run
    std::set<std::string> fileNames_;
    size_t openFiles_ = 0;
    int leakedBlocks_ = 0;
};

TEST_P(EveryFault, LeavesNothingHalfDone) {
    for (const int times : {1, kAlways}) {
        int first = 1;
        while (MeetsFault(first, times)) {
            ASSERT_FALSE(HasFailure()) << "fault " << first << (times == 1 ? ", once" : " and all after it");
            ASSERT_LT(++first, 20000) << "no end of faults";
        }
        const bool hasFiles = source_.start != StartFileFaults<Kind::kRead> || !fixture_.database.empty();
        const bool isReached = hasFiles && (operation_.writes || !source_.needsWrites);
        EXPECT_TRUE(first > 1 || !isReached) << "no fault was met";
    }
}

INSTANTIATE_TEST_SUITE_P(Operations, EveryFault, testing::ValuesIn(Combinations()),
                         [](const testing::TestParamInfo<Parameters> &info) {
                             return std::string(std::get<0>(info.param).name) + "_" +
                                    std::get<1>(info.param).name;
                         });

// What was reported as done must outlive a loss of power.
TEST(WritingOperation, IsOnDiskWhenItReturns) {
    for (const Operation &operation : Operations()) {
        if (!operation.writes)
            continue;
        Fixture fixture;
        operation.setUp(fixture);
        FileFaults::Start(Kind::kWrite, kAlways, 1);
        EXPECT_GE(operation.run(fixture), 0);
        EXPECT_FALSE(FileFaults::Stop());
        EXPECT_FALSE(FileFaults::HasUnsynced()) << operation.name;
    }
}

} // namespace
} // namespace kelo::test
