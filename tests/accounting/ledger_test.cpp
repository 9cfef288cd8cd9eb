// Books kept by hand against what the manager counts and the database holds, while its flushes fail.

#include "accounting/accounting_fixture.h"
#include "faults/file_faults.h"

using namespace kelo::test;

namespace {

constexpr int kDevices = 2000;
constexpr int kLogsPerSecond = 32000;
constexpr int kAlways = std::numeric_limits<int>::max();

std::string NameOf(int number) {
    return "device " + std::to_string(number);
}

// What makes a flush fail.
class Obstacle {
public:
    enum Kind { kNone, kPlatformCall, kWrite, kFull, kRead, kWriter, kKinds };

    Obstacle(Kind kind, int first, int times, const std::string &path) {
        if (kind == kPlatformCall)
            PlatformCalls::FailFrom(first, times);
        else if (kind == kWriter)
            lock_.emplace(path);
        else if (kind != kNone)
            FileFaults::Start(static_cast<FileFaults::Kind>(kind - kWrite), first, times);
    }
    ~Obstacle() {
        PlatformCalls::Reset();
        FileFaults::Stop();
    }
    Obstacle(const Obstacle &) = delete;
    Obstacle &operator=(const Obstacle &) = delete;

private:
    std::optional<DatabaseLock> lock_;
};

class Ledger : public AccountingTest {
protected:
    // SQLite calls a database corrupt that the disk cannot read. It keeps its name if no notification can be
    // sent.
    Ledger() { NotifyCalls::AnswerWith(-1); }

    void CountSecond() {
        ++machine.now;
        for (int i = 0; i < kLogsPerSecond; ++i) {
            ++logs_;
            const int device = static_cast<int>(logs_ % 3 == 0 ? logs_ % 7 : logs_ * 7919 % kDevices);
            CloseSample();
            accounting_.LogInc(NameOf(device));
            ++open_[NameOf(device)];
            ++counted_[NameOf(device)];
        }
    }

    // Flushes against an obstacle and checks what the database gained.
    void Flush(Obstacle::Kind kind, int first, int times) {
        int result = 0;
        {
            const Obstacle obstacle(kind, first, times, path_);
            result = accounting_.AccoutingFlush2DB();
        }
        const bool isLocked = kind == Obstacle::kWriter && !pending_.empty();
        EXPECT_TRUE(!isLocked || result == -1);
        EXPECT_EQ(waits_.TakeCount() > 0, isLocked);
        const std::vector<std::string> messages = Messages();
        const auto has = [&](const std::string &text) {
            return std::any_of(messages.begin(), messages.end(),
                               [&](const std::string &message) { return message.starts_with(text); });
        };
        const std::string gained = NewRows();
        if (result == 0) {
            EXPECT_EQ(gained, pending_);
            EXPECT_EQ(Stored(), counted_);
            pending_.clear();
            ++done_;
        } else { // what is there now will be there twice
            EXPECT_TRUE(pending_.starts_with(gained));
            repeated_ += !gained.empty();
            EXPECT_TRUE(gained.empty() || !has("Fail to execute SQL command: INSERT OR REPLACE"));
            ++failed_;
        }
    }

    void CloseSample() {
        if (machine.now == second_ || open_.empty())
            return;
        second_ = machine.now;
        for (const auto &[device, count] : open_)
            pending_ += std::to_string(second_) + " " + device + " " + std::to_string(count) + "\n";
        open_.clear();
    }

    // The rows since the call before, in the order of their insertion.
    std::string NewRows() {
        const std::string rows =
            QueryText(path_, "SELECT group_concat(stamp || ' ' || device || ' ' || eps || char(10), '') FROM "
                             "(SELECT * FROM eps WHERE id > " +
                                 lastId_ + " ORDER BY id)");
        lastId_ = QueryText(path_, "SELECT ifnull(max(id), 0) FROM eps");
        return rows;
    }

    std::map<std::string, uint64_t> Stored() const { return SyslogDBHistGet(path_, 0); }

    AccountingManager accounting_;
    uint64_t logs_ = 0;
    std::map<std::string, int> open_;
    std::map<std::string, uint64_t> counted_;
    std::string pending_; // the rows that wait for a flush
    time_t second_ = 0;
    std::string lastId_ = "0";
    int done_ = 0;
    int failed_ = 0;
    int repeated_ = 0;
};

TEST_F(Ledger, BalancesWhateverFails) {
    machine.now = 4000000000; // above what a trim of the real clock removes
    const int calls[] = {1, 2, 3, 4, 1000, 2002, 2003, 3000, 4002, 4003, 6003};
    int round = 0;
    for (const int first : calls) {
        for (int kind = Obstacle::kNone; kind < Obstacle::kKinds; ++kind) {
            CountSecond();
            Flush(static_cast<Obstacle::Kind>(kind), first, ++round % 2 == 0 ? 1 : kAlways);
            ASSERT_FALSE(HasFailure()) << "kind " << kind << ", call " << first;
        }
    }
    machine.now += 1;
    CloseSample();
    accounting_.CurEpsUpdate();
    Flush(Obstacle::kNone, 1, 1);
    EXPECT_EQ(static_cast<uint64_t>(accounting_.TotalCountGet()), logs_);
    EXPECT_EQ(SyslogDBHistTotalGet(path_), logs_);
    EXPECT_GT(done_, 10);
    EXPECT_GT(failed_, 10);
    EXPECT_GT(repeated_, 0);
}

} // namespace
