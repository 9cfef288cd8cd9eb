// Every operation against every fault: the N-th platform call, allocation, write or read fails, for N = 1, 2,
// 3, ... until none fails, once and from there on.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <limits>
#include <map>
#include <new>
#include <set>

#include "faults/allocation_faults.h"
#include "faults/file_faults.h"
#include "faults/operations.h"
#include "support/fault_pause.h"
#include "support/log_database.h"
#include "support/platform_calls.h"

namespace kelo::test {
namespace {

namespace fs = std::filesystem;

constexpr int kAlways = std::numeric_limits<int>::max();

// A way to make the `first`-th of some calls fail, `times` times.
struct FaultSource {
    const char *name;
    bool needsWrites; // reached only by operations that write
    void (*start)(int first, int times);
    std::string (*stop)(); // ends it; what failed, "" for nothing

    friend void PrintTo(const FaultSource &source, std::ostream *out) { *out << source.name; }
};

template <FileFaults::Kind Kind>
void StartFileFaults(int first, int times) {
    FileFaults::Start(Kind, first, times);
}

const std::vector<FaultSource> &FaultSources() {
    using Kind = FileFaults::Kind;
    static const std::vector<FaultSource> sources = {
        {"PlatformCall", false, PlatformCalls::FailFrom,
         [] {
             const std::string failed = PlatformCalls::FailedFunction();
             PlatformCalls::Reset();
             return failed;
         }},
        {"Allocation", false, AllocationFaults::Start,
         [] { return std::string(AllocationFaults::Stop() ? "allocation" : ""); }},
        {"Write", true, StartFileFaults<Kind::kWrite>,
         [] { return std::string(FileFaults::Stop() ? "write" : ""); }},
        {"FullDisk", true, StartFileFaults<Kind::kFull>,
         [] { return std::string(FileFaults::Stop() ? "full disk" : ""); }},
        {"Read", false, StartFileFaults<Kind::kRead>,
         [] { return std::string(FileFaults::Stop() ? "read" : ""); }},
    };
    return sources;
}

using Parameters = std::tuple<Operation, FaultSource>;

// Every operation with every source that it can meet.
std::vector<Parameters> Combinations() {
    std::vector<Parameters> combinations;
    for (const Operation &operation : Operations()) {
        for (const FaultSource &source : FaultSources()) {
            const bool isMet = source.start != AllocationFaults::Start ||
                               (AllocationFaults::IsSupported() && operation.meetsAllocationFaults);
            if (isMet)
                combinations.emplace_back(operation, source);
        }
    }
    return combinations;
}

class EveryFault : public testing::TestWithParam<Parameters> {
protected:
    void SetUp() override {
        operation_.setUp(ground_);
        for (const auto &file : fs::directory_iterator(ground_.root.Path()))
            pristine_.emplace(file.path().filename(), ReadFile(file.path()));
        RunWith(kAlways, 1); // what a process allocates or opens once is not the operation's
        openFiles_ = CountOpenFiles();
    }

    static size_t CountOpenFiles() {
        const fs::directory_iterator files("/proc/self/fd");
        return static_cast<size_t>(std::distance(begin(files), end(files)));
    }

    // SQLite keeps these beside a database after a failure.
    static bool IsCompanion(const std::string &name) {
        return name.ends_with("-wal") || name.ends_with("-shm") || name.ends_with("-journal");
    }

    void CheckFileNames() const {
        std::set<std::string> before;
        std::set<std::string> after;
        for (const auto &[name, content] : pristine_)
            before.insert(name);
        for (const auto &file : fs::directory_iterator(ground_.root.Path()))
            after.insert(file.path().filename());
        std::erase_if(before, IsCompanion);
        std::erase_if(after, IsCompanion);
        EXPECT_EQ(after, before);
    }

    void PutBackFiles() {
        for (const auto &file : fs::directory_iterator(ground_.root.Path()))
            fs::remove_all(file);
        for (const auto &[name, content] : pristine_)
            WriteFile(ground_.root.File(name), content);
        ground_.seen.clear();
    }

    Outcome RunWith(int first, int times) {
        PutBackFiles();
        SyslogCapture capture;
        Outcome outcome;
        source_.start(first, times);
        AllocationFaults::StartCounting();
        try {
            outcome.result = operation_.run(ground_);
        } catch (const std::bad_alloc &) {
            outcome.outOfMemory = true;
        }
        leakedBlocks_ = AllocationFaults::StopCounting();
        outcome.fault = source_.stop();
        outcome.messages = capture.Texts();
        return outcome;
    }

    void CheckGround() {
        EXPECT_EQ(PlatformCalls::OpenConnections(), 0);
        EXPECT_EQ(PlatformCalls::OpenResults(), 0);
        EXPECT_EQ(leakedBlocks_, 0);
        EXPECT_EQ(CountOpenFiles(), openFiles_);
        CheckFileNames();
        if (!ground_.database.empty()) {
            EXPECT_EQ(QueryText(ground_.database, "PRAGMA integrity_check"), "ok");
        }
    }

    // Runs with the fault and checks everything. Returns false when no fault was met, which ends a loop.
    bool MeetsFault(int first, int times) {
        const Outcome outcome = RunWith(first, times);
        EXPECT_TRUE(!outcome.outOfMemory || outcome.fault == "allocation");
        CheckGround();
        operation_.check(ground_, outcome);
        if (!outcome.fault.empty())
            return true;
        EXPECT_TRUE(outcome.IsDone()) << "failed without a fault";
        return false;
    }

    const Operation operation_ = std::get<0>(GetParam());
    const FaultSource source_ = std::get<1>(GetParam());
    Ground ground_;

private:
    std::map<std::string, std::string> pristine_; // content by name
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
        if (operation_.writes || !source_.needsWrites) {
            EXPECT_GT(first, 1) << "no fault was met";
        }
    }
}

INSTANTIATE_TEST_SUITE_P(Operations, EveryFault, testing::ValuesIn(Combinations()),
                         [](const testing::TestParamInfo<Parameters> &info) {
                             return std::string(std::get<0>(info.param).name) + "_" +
                                    std::get<1>(info.param).name;
                         });

// What a deletion reported as done must outlive a loss of power.
TEST(SyslogDBDelete, IsOnDiskWhenItReturns) {
    for (const Operation &operation : Operations()) {
        if (!operation.writes)
            continue;
        Ground ground;
        operation.setUp(ground);
        FileFaults::Start(FileFaults::Kind::kWrite, kAlways, 1);
        EXPECT_GE(operation.run(ground), 0);
        EXPECT_FALSE(FileFaults::Stop());
        EXPECT_FALSE(FileFaults::HasUnsynced()) << operation.name;
    }
}

} // namespace
} // namespace kelo::test
