#include <algorithm>
#include <filesystem>
#include <functional>
#include <random>

#include "platform/db_fixture.h"

using namespace kelo::test;

namespace {

constexpr uint32_t kSeed = 20200102;
constexpr int kRounds = 150;
constexpr size_t kPage = 512;
constexpr size_t kWalHeader = 32;

using Random = std::mt19937;
size_t Below(Random &random, size_t bound) {
    return std::uniform_int_distribution<size_t>(0, bound - 1)(random);
}

struct Files {
    std::string database;
    std::string wal;
};

// A database with tables, indexes, overflow pages and free pages, and rows that only the WAL holds.
Files MakeFiles(const TempRoot &root) {
    const std::string path = root.File("made.db");
    RunSql(
        path,
        "PRAGMA page_size=512; PRAGMA journal_mode=wal;"
        "CREATE TABLE logs(id INTEGER PRIMARY KEY, host TEXT, msg TEXT); CREATE INDEX by_host ON logs(host);"
        "WITH n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 200)"
        "INSERT INTO logs SELECT i, 'host' || i % 7, printf('%.*c', i * 7 % 900, 'x') FROM n;"
        "DELETE FROM logs WHERE id BETWEEN 50 AND 70");
    const Connection writer = ConnectTo(path);
    EXPECT_EQ(Execute(writer, "UPDATE logs SET host = 'changed' WHERE id % 3 = 0").status, 0);
    return {ReadFile(path), ReadFile(path + "-wal")};
}

const struct Damage {
    const char *name;
    std::function<void(Files &, Random &)> apply;
    bool needsWal = false;
    bool isIgnored = false;
} kDamages[] = {
    {"bits",
     [](Files &files, Random &random) {
         for (size_t i = 0, count = 1 + Below(random, 64); i < count; ++i)
             files.database[Below(random, files.database.size())] ^= static_cast<char>(1 << Below(random, 8));
     }},
    {"header",
     [](Files &files, Random &random) {
         files.database[16 + Below(random, 84)] = static_cast<char>(Below(random, 256));
         files.database[100 + Below(random, 8)] = static_cast<char>(Below(random, 256));
     }},
    {"page heads",
     [](Files &files, Random &random) {
         const size_t page = Below(random, files.database.size() / kPage);
         for (size_t i = 0; i < 16; ++i)
             files.database[page * kPage + Below(random, 24)] = static_cast<char>(Below(random, 256));
     }},
    {"truncation",
     [](Files &files, Random &random) { files.database.resize(Below(random, files.database.size())); }},
    {"swapped pages",
     [](Files &files, Random &random) {
         const size_t pages = files.database.size() / kPage;
         char *base = files.database.data();
         std::swap_ranges(base, base + kPage, base + Below(random, pages) * kPage);
         char *one = base + Below(random, pages) * kPage;
         char *other = base + Below(random, pages) * kPage;
         if (one != other)
             std::swap_ranges(one, one + kPage, other);
     }},
    {"wal bits",
     [](Files &files, Random &random) {
         files.wal[Below(random, files.wal.size())] ^= static_cast<char>(1 << Below(random, 8));
     },
     true, true},
    {"foreign wal",
     [](Files &files, Random &random) {
         // Frames whose checksums hold, over a database that has other pages in their places.
         files.wal.resize(kWalHeader + Below(random, files.wal.size() - kWalHeader));
         std::rotate(files.database.begin() + kPage,
                     files.database.begin() + static_cast<std::ptrdiff_t>(kPage * (2 + Below(random, 20))),
                     files.database.end());
     },
     true, false},
};

} // namespace

TEST(DamagedDatabase, GivesRowsOrAnErrorAndNeverACrash) {
    const TempRoot root;
    const Files sound = MakeFiles(root);
    const std::string path = root.File("logs.db");
    Random random(kSeed);
    for (const Damage &damage : kDamages) {
        int failures = 0;
        for (int round = 0; round < kRounds; ++round) {
            SCOPED_TRACE(std::string(damage.name) + " " + std::to_string(round));
            Files files = sound;
            damage.apply(files, random);
            std::filesystem::remove(path + "-shm");
            WriteFile(path, files.database);
            // What the WAL holds hides damage behind it, so every other time there is none.
            WriteFile(path + "-wal", damage.needsWal || round % 2 == 0 ? files.wal : "");
            const Connection connection = ConnectTo(path);
            ASSERT_NE(connection, nullptr);
            Execute(connection, "PRAGMA synchronous=OFF"); // saves most of the test's time
            for (const char *sql :
                 {"SELECT * FROM logs", "SELECT * FROM logs WHERE host = 'changed' ORDER BY msg",
                  "DELETE FROM logs WHERE id % 5 = 0"}) {
                const Outcome outcome = Execute(connection, sql, {"id", "host", "msg"});
                // A failure has a cause and no result.
                ASSERT_EQ(outcome.status != 0,
                          outcome.errorCode != SQLITE_OK && outcome.errorCode < SQLITE_ROW);
                ASSERT_FALSE(outcome.status != 0 && outcome.hasResult);
                failures += outcome.status != 0;
            }
        }
        // SQLite ignores a WAL from the first frame on whose checksum is wrong.
        EXPECT_EQ(failures > 0, !damage.isIgnored) << damage.name;
    }
}
