#include "run.h"

#include <sys/wait.h>
#include <unistd.h>

#include <cinttypes>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <thread>

#include "attic.h"
#include "audit.h"
#include "base/files.h"
#include "crew.h"
#include "damage.h"
#include "disk.h"
#include "keloplatform/kelodb.h"
#include "kelosyslog/dbhandler.h"

namespace kelo::stress {
namespace {

namespace fs = std::filesystem;

// What happens again and again, after random pauses.
class Moment {
public:
    Moment(std::mt19937_64 &random, int64_t leastMs, int64_t mostMs)
        : random_(random), pause_(leastMs, mostMs), next_(NowMs() + pause_(random)) {}
    bool HasCome() {
        if (NowMs() < next_)
            return false;
        next_ = NowMs() + pause_(random_);
        return true;
    }

private:
    std::mt19937_64 &random_;
    std::uniform_int_distribution<int64_t> pause_;
    int64_t next_;
};

class Disturber {
public:
    Disturber(const Site &site, const Options &options)
        : site_(site), options_(options), random_(options.seed), disk_(site), board_(Board::Make()),
          attic_(site), crew_(site, board_, options.seed), ledger_(site, kDamageId, kLogs) {}

    // Returns whether nothing was wrong.
    bool Execute() {
        if (!disk_.CanFill())
            std::printf("SKIPPED: no file system may be mounted, so the disk is never full\n");
        Disturb();
        board_.isOver = true;
        disk_.Empty();
        crew_.End();
        Settle();
        return Report(Audit(site_));
    }

private:
    static constexpr uint32_t kDamageId = 0; // of the ledger of this process
    struct Pending {                         // a database with a damaged write-ahead log
        ino_t inode = 0;
        int64_t orderTime = 0;
    };

    void Disturb() {
        Moment kill(random_, 50, 400);
        Moment damage(random_, 200, 1500);
        Moment fill(random_, 3000, 6000);
        Moment empty(random_, 200, 1500);
        Moment order(random_, 5000, 15000);
        Moment remove(random_, 1000, 3000);
        const int64_t end = NowMs() + options_.seconds * 1000;
        while (NowMs() < end) {
            crew_.Look();
            if (kill.HasCome())
                crew_.KillSomebody();
            if (damage.HasCome())
                DamageSomething();
            if (disk_.CanFill() && fill.HasCome()) {
                disk_.Fill((random_() % 40) * 4096);
                ++fills_;
            } else if (empty.HasCome()) {
                disk_.Empty();
            }
            if (order.HasCome())
                Order(static_cast<Database>(random_() % kDatabases));
            if (remove.HasCome())
                RemoveFromDisk();
            for (const Database database : {kEvents, kAccounts, kLogs})
                EndRisk(database);
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
        }
    }

    void DamageSomething() {
        const auto database = static_cast<Database>(random_() % kDatabases);
        const size_t chance = random_() % 10;
        const Damage damage = chance < 5 ? Damage::kPages : chance < 8 ? Damage::kHeader : Damage::kWal;
        crew_.Freeze();
        // A removal that a damaged write-ahead log takes back would be an archive's second copy.
        const bool mayBe =
            damage != Damage::kWal || (board_.risk[database] % 2 == 0 && board_.archiving % 2 == 0);
        if (mayBe && Inflict(damage, site_.PathOf(database), random_, ledger_)) {
            ++damages_[static_cast<size_t>(damage)];
            Remember(std::string("damaged ") + kDamageNames[static_cast<size_t>(damage)], database);
            attic_.Expect(InodeOf(site_.PathOf(database)), damage == Damage::kWal);
            if (damage == Damage::kWal) {
                ++board_.risk[database];
                pending_[database] = {InodeOf(site_.PathOf(database)),
                                      NowMs() + static_cast<int64_t>(random_() % 2000)};
            }
        }
        crew_.Thaw();
    }

    // What a damaged write-ahead log loses cannot be known, so the database must go, if nobody has met the
    // damage by then.
    void EndRisk(Database database) {
        Pending &pending = pending_[database];
        if (pending.inode == 0)
            return;
        const std::string path = site_.PathOf(database);
        if (InodeOf(path) != pending.inode) {
            pending = {};
            ++board_.risk[database];
        } else if (NowMs() >= pending.orderTime) {
            pending.orderTime = NowMs() + 5000;
            Order(database);
        }
    }

    // Has the present file of a database set aside, damaged or not.
    void Order(Database database) {
        const std::string path = site_.PathOf(database);
        const ino_t inode = InodeOf(path);
        if (inode == 0)
            return;
        ++orders_;
        attic_.Expect(inode);
        Remember("ordered aside", database);
        if (fork() == 0) {
            DBConnect_tag *const connection = KELODBConnect(nullptr, nullptr, nullptr, path.c_str());
            if (connection != nullptr && InodeOf(path) == inode)
                DBErrorHandle_SQLITE_CORRUPT(connection, path);
            KELODBClose(connection);
            _exit(0);
        }
    }

    // What fills the disk for ever, with so much that there is no room for an archive.
    void LimitSize() {
        constexpr uintmax_t kMostBytes = 6 << 20;
        std::error_code isMissing;
        for (const Database database : {kEvents, kAccounts, kLogs}) {
            const auto bytes = fs::file_size(site_.PathOf(database), isMissing);
            if (!isMissing && bytes > kMostBytes)
                Order(database);
        }
    }

    // For whoever must explain a fault.
    void Remember(const std::string &what, Database database) {
        history_ << NowMs() << " " << what << " " << kDatabaseNames[database] << " inode "
                 << InodeOf(site_.PathOf(database)) << std::endl;
    }

    void RemoveFromDisk() {
        crew_.Freeze();
        const std::set<std::string> open = Crew::OpenFiles();
        attic_.Take([&](const std::string &path) { return open.contains(path); });
        crew_.Thaw();
        LimitSize();
    }

    // Finishes what was killed, and sets aside what is damaged.
    void Settle() {
        for (const Database database : {kEvents, kAccounts, kLogs}) {
            const std::string path = site_.PathOf(database);
            if (pending_[database].inode != 0 && InodeOf(path) == pending_[database].inode) {
                Order(database);
                wait(nullptr);
            }
            if (fs::exists(path) && crew_.Own().RunProgram({"db", "check", "--db", path}).status == 3)
                crew_.Own().RunProgram({"db", "quarantine", "--yes", "--db", path});
        }
        if (fs::exists(site_.PathOf(kLogs)))
            crew_.Own().RunProgram({"archive", "--remove-archived", "--yes"}, "", 1);
        attic_.Take([](const std::string &) { return false; });
        if (attic_.Unexpected() > 0)
            crew_.Own().Complain(std::to_string(attic_.Unexpected()) +
                                 " databases were set aside that were neither damaged nor ordered aside");
        if (attic_.SetAside() > attic_.Notifications())
            crew_.Own().Complain(std::to_string(attic_.SetAside()) + " databases were set aside with " +
                                 std::to_string(attic_.Notifications()) + " notifications");
    }

    bool Report(const Findings &found) const {
        std::printf(
            "seed %" PRIu64 ", %" PRId64 " s, %" PRIu64 " processes killed, damaged: %" PRIu64
            " times pages, %" PRIu64 " headers, %" PRIu64 " write-ahead logs; disk full %" PRIu64 " times\n",
            options_.seed, options_.seconds, crew_.Kills(), damages_[0], damages_[1], damages_[2], fills_);
        for (size_t kind = 0; kind < kKinds; ++kind)
            std::printf("%-26s %8" PRIu64 " and %" PRIu64 " that failed\n", NameOf(static_cast<int>(kind)),
                        board_.done[kind].load(), board_.failed[kind].load());
        std::printf("databases set aside: %" PRIu64 " (%" PRIu64 " ordered), notifications: %" PRIu64 "\n",
                    attic_.SetAside(), orders_, attic_.Notifications());
        std::printf("tokens tried: %" PRIu64 ", acknowledged and not deleted: %" PRIu64 "; of these %" PRIu64
                    " in databases, %" PRIu64 " in archives, %" PRIu64 " set aside, %" PRIu64
                    " only in the bytes of files set aside, %" PRIu64 " overwritten, %" PRIu64
                    " lost with a damaged write-ahead log\n",
                    found.tried, found.acknowledged, found.live, found.archived, found.aside, found.inBytes,
                    found.destroyed, found.atRisk);
        for (const std::string &fault : found.faults)
            std::printf("FAULT: %s\n", fault.c_str());
        const std::string complaints = tool::ReadWhole(site_.Complaints()).value_or("");
        std::printf("%s", complaints.c_str());
        return found.faults.empty() && complaints.empty();
    }

    static constexpr std::array<const char *, 3> kDamageNames = {"pages", "header", "write-ahead log"};

    const Site &site_;
    const Options options_;
    std::ofstream history_{site_.folder + "/history"};
    std::mt19937_64 random_;
    Disk disk_;
    Board &board_;
    Attic attic_;
    Crew crew_;
    Ledger ledger_;
    std::array<Pending, kDatabases> pending_{};
    std::array<uint64_t, 3> damages_{};
    uint64_t fills_ = 0;
    uint64_t orders_ = 0;
};

} // namespace

bool Run(const Site &site, const Options &options) {
    return Disturber(site, options).Execute();
}

} // namespace kelo::stress
