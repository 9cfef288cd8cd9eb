// One event added to event logs of 100, 10,000 and 25,000 rows, against the same statements through bare
// SQLite, and the shares of an addition.

#include <sqlite3.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <memory>
#include <sstream>

#include "kelosyslog/logger.h"
#include "support/measure.h"

using namespace kelo::bench;

namespace {

constexpr int kRounds = 51;
constexpr int kRotatedFrom = 20000;
constexpr const char *kUser = "SYSTEM";
constexpr const char *kEvent =
    "Event detection: Received log which contains [disk]. Log content: [disk full on nas1]";

struct Folder {
    std::string path = (std::filesystem::temp_directory_path() / "bench-event-XXXXXX").string();
    Folder() {
        if (mkdtemp(path.data()) == nullptr)
            Fail("no folder " + path);
    }
    ~Folder() { std::filesystem::remove_all(path); }
    Folder(const Folder &) = delete;
    Folder &operator=(const Folder &) = delete;
};

// A connection as the platform library sets it up, as far as it touches the database.
class Bare {
public:
    explicit Bare(const std::string &path) {
        sqlite3 *db = nullptr;
        const int status =
            sqlite3_open_v2(path.c_str(), &db, SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX, nullptr);
        db_.reset(db);
        if (status != SQLITE_OK)
            Fail("cannot open " + path);
        sqlite3_busy_timeout(db, 5000);
    }
    void Run(const char *sql) const {
        if (sqlite3_exec(db_.get(), sql, nullptr, nullptr, nullptr) != SQLITE_OK)
            Fail(std::string(sql) + ": " + sqlite3_errmsg(db_.get()));
    }

private:
    struct Close {
        void operator()(sqlite3 *db) const { sqlite3_close(db); }
    };
    std::unique_ptr<sqlite3, Close> db_;
};

// The steps of an addition, in milliseconds.
struct Shares {
    double connect = 0; // and close, of all connections
    double insert = 0;  // with the commit
    double count = 0;
    double rotate = 0; // the lookup and the deletion
    double vacuum = 0;

    double Sum() const { return connect + insert + count + rotate + vacuum; }
};

std::string InsertStatement() {
    const std::unique_ptr<char, void (*)(void *)> sql(
        sqlite3_mprintf("INSERT INTO log VALUES(NULL, '%d', '%lu', '%q', '%q');", 0, 1700000000UL, kUser,
                        kEvent),
        sqlite3_free);
    return sql.get();
}

// The connections are nested as LogAdd nests them.
Shares AddBare(const std::string &path, bool rotates) {
    Shares shares;
    std::unique_ptr<Bare> outer;
    std::unique_ptr<Bare> inner;
    const auto reconnect = [&] {
        inner.reset();
        inner = std::make_unique<Bare>(path);
    };
    shares.connect += Time([&] { outer = std::make_unique<Bare>(path); });
    shares.insert = Time([&] {
        outer->Run("BEGIN;");
        outer->Run(InsertStatement().c_str());
        outer->Run("END;");
    });
    shares.connect += Time(reconnect);
    shares.count = Time([&] { inner->Run("SELECT COUNT(*) FROM log"); });
    if (rotates) {
        shares.connect += Time(reconnect);
        shares.rotate = Time([&] {
            inner->Run("SELECT time FROM log ORDER BY time DESC LIMIT 1 OFFSET 18000");
            inner->Run("DELETE FROM log WHERE time <= 0");
        });
        shares.vacuum = Time([&] { inner->Run("VACUUM"); });
    }
    shares.connect += Time([&] {
        inner.reset();
        outer.reset();
    });
    return shares;
}

void Create(const std::string &path, int rows) {
    std::ostringstream schema;
    schema << std::ifstream(KELO_EVENT_SCHEMA).rdbuf();
    { const std::ofstream empty(path); }
    const Bare db(path);
    db.Run(("PRAGMA journal_mode=WAL;" + schema.str() +
            "WITH n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < " + std::to_string(rows) +
            ") INSERT INTO log SELECT NULL, 0, 1600000000 + i * 60, 'SYSTEM', '" + kEvent + "' FROM n")
               .c_str());
}

void PrintShares(int rows, const Shares &shares) {
    const double percent = 100 / shares.Sum();
    std::printf(
        "\n%d rows, bare SQLite, the fastest run: connecting and closing %.3f ms (%.0f %%), insert with its "
        "commit "
        "%.3f (%.0f %%), count %.3f (%.0f %%), lookup and deletion %.3f (%.0f %%), VACUUM %.3f (%.0f %%)\n",
        rows, shares.connect, shares.connect * percent, shares.insert, shares.insert * percent, shares.count,
        shares.count * percent, shares.rotate, shares.rotate * percent, shares.vacuum,
        shares.vacuum * percent);
}

} // namespace

int main() {
    const Folder folder;
    PrintHeading("One event added", "ms");
    bool allKept = true;
    for (const int rows : {100, 10000, 25000}) {
        const std::string path = folder.path + "/" + std::to_string(rows) + ".db";
        const bool rotates = rows >= kRotatedFrom;
        Create(path, rows);
        Shares fastest;
        const auto addBare = [&] {
            const Shares shares = AddBare(path, rotates);
            if (fastest.Sum() == 0 || shares.Sum() < fastest.Sum())
                fastest = shares;
            return shares.Sum();
        };
        const auto add = [&] {
            return Time([&] {
                if (Logger().LogAdd(path, 0, kUser, kEvent) != 0)
                    Fail("LogAdd failed");
            });
        };
        const auto times = MedianTimes({{"bare", addBare}, {"library", add}}, kRounds);
        allKept = PrintRatio("LogAdd to " + std::to_string(rows) + " rows", times[1],
                             "the same statements through bare SQLite", times[0], 1.15) &&
                  allKept;
        PrintShares(rows, fastest);
    }
    return allKept ? 0 : 1;
}
