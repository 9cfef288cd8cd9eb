// Searches for keywords with the skip index: in the library against the scan, and from start to exit of the
// program against grep, ripgrep, the sqlite3 shell, lnav and journalctl; and the start of the program itself.
// What is not installed is skipped.
//
//   bench_search_index [ROWS]      1,000,000 unless given

#include <fcntl.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>
#include <wordexp.h>

#include <algorithm>

#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <fstream>
#include <functional>
#include <list>
#include <memory>
#include <sstream>
#include <string>
#include <utility>

#include "keloplatform/gensqlregexp.h"
#include "keloplatform/kelodb.h"
#include "keloplatform/skip_index.h"
#include "kelosyslog/dbutil.h"
#include "real_text.h"
#include "support/account_database.h"
#include "support/folder.h"
#include "support/measure.h"

using namespace kelo::bench;

namespace {

constexpr int kFullSize = 5'000'000; // the rows for which the bounds of rare words are meant

// A scan of many rows takes seconds.
int RoundsFor(int rows) {
    return rows < kFullSize ? 7 : 3;
}

struct Search {
    const char *name;
    const char *keyword;
    const char *host;
    const char *from; // day
    bool isPage;      // the newest 50, otherwise a count
    double atMost;    // of the time of the scan
};
constexpr Search kSearches[] = {
    {"count, rare word", "Segfault", "", "", false, 0.01},
    {"count, absent word", "zorglub", "", "", false, 0.01},
    {"count, absent address", "\"SRC=10.300.1.2 \"", "", "", false, 0.01},
    {"count, rare phrase", "\"Segfault at 0\"", "", "", false, 0.01},
    {"count, rare regex", "/Seg(fault|mentation) at [0-9]/", "", "", false, 0.01},
    {"count, rare word without another", "Segfault -publickey", "", "", false, 0.01},
    {"count, rare words in either", "Segfault OR zorglub", "", "", false, 0.02},
    {"count, word of a thousandth", "unverändert", "", "", false, 0.25},
    {"count, rare word of a host", "Segfault", "server7", "", false, 0.05},
    {"count, rare word from a day on", "Segfault", "", "2020/01/03", false, 0.05},
    {"page, rare word", "Segfault", "", "", true, 0.02},
    {"page, rare word of a host", "Segfault", "server7", "", true, 0.05},
    {"page, common word", "publickey", "", "", true, 1.5},
    {"count, common word", "publickey", "", "", false, 1.05},
    {"count, short word", "ssh", "", "", false, 1.05},
    {"count, regex without literals", "/[0-9]{9}/", "", "", false, 1.05},
    {"count, excluded word", "-publickey", "", "", false, 1.05},
};

int Count(_SYSLOG_LOG_DATA_tag &, void *rows) {
    ++*static_cast<int *>(rows);
    return 0;
}

// The number of rows, or of those on the page.
int Find(const std::string &database, const Search &search) {
    std::list<_SYSLOG_SQL_COND_tag> conditions;
    LogSearchCondListGen(search.host, "", "", "", search.keyword, search.from, "", conditions);
    if (!search.isPage)
        return SyslogDBSelectCount(database, conditions, nullptr, nullptr);
    _SYSLOG_SQL_LIMIT_tag page{50, 0};
    _SYSLOG_SQL_ORDER_tag newestFirst{0, SYSLOG_ATTRI_ID};
    int rows = 0;
    return SyslogDBSelect(database, conditions, &page, &newestFirst, Count, &rows, false) == 0 ? rows : -1;
}

int FindByScan(const std::string &database, const Search &search) {
    setenv("KELO_SKIP_INDEX", "off", 1);
    const int found = Find(database, search);
    unsetenv("KELO_SKIP_INDEX");
    return found;
}

bool CompareWithScan(const std::string &database, int rows) {
    bool allKept = true;
    PrintHeading("Keywords in " + std::to_string(rows) + " rows, with the skip index", "ms");
    for (const Search &search : kSearches) {
        if (Find(database, search) != FindByScan(database, search))
            Fail(std::string(search.name) + ": another result than the scan");
        const auto times =
            MedianTimes({{"index", [&] { return Time([&] { Find(database, search); }); }},
                         {"scan", [&] { return Time([&] { FindByScan(database, search); }); }}},
                        RoundsFor(rows));
        // What a search costs at least is the same for a smaller table, the scan is not.
        const double atMost =
            search.atMost < 0.5 ? search.atMost * kFullSize / std::min(rows, kFullSize) : search.atMost;
        allKept = PrintRatio(search.name, times[0], "scan", times[1], atMost) && allKept;
    }
    return allKept;
}

bool IsInstalled(const std::string &program) {
    return std::system(("command -v " + program + " >/dev/null").c_str()) == 0;
}

// Says so where it is not.
bool IsInstalledOrSkipped(const std::string &program) {
    const bool isInstalled = IsInstalled(program);
    if (!isInstalled)
        std::printf("| %s: skipped, it is not installed | | | | | | |\n", program.c_str());
    return isInstalled;
}

// Runs it, without a shell, which would take a tenth of the shortest times. Through a pipe: grep stops at the
// first match if it writes to /dev/null.
void RunProgram(char *const *arguments) {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0)
        Fail("no pipe");
    posix_spawn_file_actions_t streams;
    posix_spawn_file_actions_init(&streams);
    posix_spawn_file_actions_addopen(&streams, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_adddup2(&streams, ends[1], STDOUT_FILENO);
    pid_t child = 0;
    const int error = posix_spawnp(&child, arguments[0], &streams, nullptr, arguments, environ);
    posix_spawn_file_actions_destroy(&streams);
    close(ends[1]);
    char output[65536];
    while (read(ends[0], output, sizeof output) > 0) {
    }
    close(ends[0]);
    if (error != 0 || waitpid(child, nullptr, 0) != child)
        Fail(std::string("cannot run ") + arguments[0]);
}

// The time from start to exit of a command, with quotes as for a shell.
double TimeOf(const std::string &command) {
    wordexp_t words;
    if (wordexp(command.c_str(), &words, WRDE_NOCMD) != 0)
        Fail("cannot read the command " + command);
    const double time = Time([&] { RunProgram(words.we_wordv); });
    wordfree(&words);
    return time;
}

std::string CountCommand(const std::string &database, const std::string &word) {
    return KELO_PROGRAM " count -g " + word + " --db '" + database + "'";
}

// Makes the next reader of the file read it from the disk.
void Evict(const std::string &path) {
    const int file = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (file < 0 || fsync(file) != 0 || posix_fadvise(file, 0, 0, POSIX_FADV_DONTNEED) != 0)
        Fail("cannot evict " + path);
    close(file);
}

double ColdTimeOf(const std::string &database, const std::string &command) {
    for (const char *suffix : {"", "-skip", ".txt"})
        Evict(database + suffix);
    return TimeOf(command);
}

// The disk decides; nothing is promised but that the index helps.
bool CompareCold(const std::string &database, int rows) {
    const std::string text = "'" + database + ".txt'";
    bool allKept = true;
    PrintHeading("kelosyslog count -g Segfault in " + std::to_string(rows) + " rows that are not in memory",
                 "ms");
    const std::string ours = CountCommand(database, "Segfault");
    const std::pair<const char *, std::string> others[] = {
        {"scan", "env KELO_SKIP_INDEX=off " + ours},
        {"rg", "rg -c -F -e Segfault " + text},
        {"grep", "env LC_ALL=C grep -c -F -e Segfault " + text},
    };
    for (const auto &[name, command] : others) {
        if (name != std::string("scan") && !IsInstalledOrSkipped(name))
            continue;
        const auto times =
            MedianTimes({{"ours", [&] { return ColdTimeOf(database, ours); }},
                         {name, [&, &other = command] { return ColdTimeOf(database, other); }}},
                        3);
        allKept = PrintRatio("rare word", times[0], name, times[1], 1) && allKept;
    }
    return allKept;
}

bool CompareProgram(const std::string &database, int rows) {
    bool allKept = true;
    PrintHeading("kelosyslog count -g WORD in " + std::to_string(rows) + " rows, from start to exit", "ms");
    for (const std::string word : {"Segfault", "zorglub", "publickey"}) {
        const bool isCommon = word == "publickey";
        const std::string text = "'" + database + ".txt'";
        const double scale = static_cast<double>(kFullSize) / std::min(rows, kFullSize);
        const struct {
            const char *program;
            std::string command;
            double atMost;
        } others[] = {
            {"rg", "rg -c -F -e " + word + " " + text, 0.1 * scale},
            {"grep", "env LC_ALL=C grep -c -F -e " + word + " " + text, 0.1 * scale},
            {"sqlite3",
             "sqlite3 '" + database + "' \"SELECT COUNT(*) FROM logs WHERE " + GenSQLRegexp(word, "msg") +
                 "\"",
             0.02 * scale},
        };
        for (const auto &[program, command, atMost] : others) {
            if (!IsInstalledOrSkipped(program))
                continue;
            const auto times = MedianTimes({{"ours", [&] { return TimeOf(CountCommand(database, word)); }},
                                            {program, [&, &other = command] { return TimeOf(other); }}},
                                           RoundsFor(rows));
            // Nothing is promised where all rows are read.
            allKept = PrintRatio(word, times[0], program, times[1], isCommon ? 100 : atMost) && allKept;
        }
    }
    return allKept;
}

// The newest record, which takes hardly more than the start and the end of the programs.
bool CompareStart(const std::string &database) {
    constexpr int kStarts = 100;
    if (!IsInstalledOrSkipped("sqlite3"))
        return true;
    PrintHeading("kelosyslog search -n 1 from start to exit", "ms");
    const std::string ours = KELO_PROGRAM " search -n 1 --db '" + database + "'";
    const std::string other = "sqlite3 '" + database + "' 'SELECT * FROM logs ORDER BY id DESC LIMIT 1'";
    const auto times = MedianTimes(
        {{"ours", [&] { return TimeOf(ours); }}, {"sqlite3", [&] { return TimeOf(other); }}}, kStarts);
    return PrintRatio("newest record", times[0], "sqlite3", times[1], 1.5);
}

// The journal with the messages of a text file; "" where it cannot be made.
std::string JournalOf(const std::string &text) {
    std::string journal = text + ".journal";
    constexpr char kWriter[] = "/lib/systemd/systemd-journal-remote";
    if (access(kWriter, X_OK) != 0)
        return "";
    if (access(journal.c_str(), F_OK) == 0)
        return journal;
    const std::string entry =
        R"(printf "__REALTIME_TIMESTAMP=%.0f\n__MONOTONIC_TIMESTAMP=%d\n_BOOT_ID=%032d\n)"
        R"(MESSAGE=%s\n\n", 1577836800000000 + NR, NR, 1, $0)";
    const std::string command =
        "awk '{ " + entry + " }' '" + text + "' | " + kWriter + " -o '" + journal + "' - >/dev/null 2>&1";
    return std::system(command.c_str()) == 0 ? journal : "";
}

// Viewers of logs, which take seconds: a few rounds for one word.
bool CompareViewers(const std::string &database, int rows) {
    constexpr int kViewerRounds = 2;
    constexpr int kMostRows = 1'000'000; // of a journal, which takes a minute to write
    bool allKept = true;
    const auto compare = [&](const std::string &program, const std::string &command) {
        const auto times = MedianTimes({{"ours", [&] { return TimeOf(CountCommand(database, "Segfault")); }},
                                        {program, [&] { return TimeOf(command); }}},
                                       kViewerRounds);
        allKept = PrintRatio("Segfault", times[0], program, times[1], 0.1) && allKept;
    };
    if (IsInstalledOrSkipped("lnav"))
        compare("lnav", "lnav -n -c ':filter-in Segfault' '" + database + ".txt'");
    if (!IsInstalledOrSkipped("journalctl"))
        return allKept;
    if (rows > kMostRows) {
        std::printf("| journalctl: skipped, its journal is only written for up to %d rows | | | | | | |\n",
                    kMostRows);
        return allKept;
    }
    const std::string journal = JournalOf(database + ".txt");
    if (journal.empty())
        std::printf("| journalctl: skipped, systemd-journal-remote is not installed | | | | | | |\n");
    else
        compare("journalctl", "journalctl -q --file '" + database + ".txt*.journal' -g Segfault");
    return allKept;
}

// Milliseconds of the processor that `work` takes.
double CpuTime(const std::function<void()> &work) {
    const std::clock_t start = std::clock();
    work();
    return 1000.0 * static_cast<double>(std::clock() - start) / CLOCKS_PER_SEC;
}

// What SQLite itself takes to store one of the rows in another database of the same schema, in the batches of
// the receiver: the least that storing costs.
double InsertTime(const std::string &database) {
    constexpr int kBatch = 5'000;
    constexpr int kInserted = 200'000;
    const Folder folder("bench-insert");
    std::ostringstream schema;
    schema << std::ifstream(KELO_LOGS_SCHEMA).rdbuf();
    const Database db = OpenDatabase(folder.Path() + "/logs.db");
    Run(db.get(), "PRAGMA journal_mode=WAL; PRAGMA synchronous=NORMAL;" + schema.str() + "ATTACH '" +
                      database + "' AS source");
    return CpuTime([&] {
               for (int first = 1; first <= kInserted; first += kBatch)
                   Run(db.get(), "INSERT INTO main.logs SELECT * FROM source.logs WHERE id BETWEEN " +
                                     std::to_string(first) + " AND " + std::to_string(first + kBatch - 1));
           }) /
           kInserted;
}

// Milliseconds: of the clock and of the processor.
struct BuildTime {
    double elapsed;
    double cpu;
};

BuildTime TimeOfBuilding(const std::string &database) {
    KELODBSkipIndexRemove(database.c_str());
    BuildTime time{};
    time.cpu = CpuTime([&] {
        time.elapsed = Time([&] {
            if (KELODBSkipIndexBuild(database.c_str(), 0) != KELODB_SKIP_COMPLETE)
                Fail("no index for " + database);
        });
    });
    return time;
}

bool Build(const std::string &database) {
    TimeOfBuilding(database); // reads the database into memory
    const BuildTime time = TimeOfBuilding(database);
    KELODBSkipIndex index;
    struct stat file {};
    const std::unique_ptr<DBConnect_tag, decltype(&KELODBClose)> connection(
        KELODBConnect(nullptr, nullptr, nullptr, database.c_str()), &KELODBClose);
    if (KELODBSkipIndexGet(connection.get(), &index) != 0 || stat(database.c_str(), &file) != 0)
        Fail("no index of " + database);
    const double share = static_cast<double>(index.diskBytes) / static_cast<double>(file.st_size);
    std::printf(
        "Building took %.0f ms, %.2f µs a row; the index has %.1f %% of the database's size, which is at "
        "most 7: %s\n",
        time.elapsed, 1000 * time.elapsed / static_cast<double>(index.endId - index.firstId), 100 * share,
        share <= 0.07 ? "kept" : "MISSED");
    PrintHeading("Building the index: processor time", "µs a row");
    const double perRow = time.cpu / static_cast<double>(index.endId - index.firstId);
    return PrintRatio("index", 1000 * perRow, "inserting", 1000 * InsertTime(database), 0.125) &&
           share <= 0.07;
}

} // namespace

int main(int argc, char **argv) {
    const int rows = argc > 1 ? std::atoi(argv[1]) : 1'000'000;
    const std::string database = RealTextDatabase(rows);
    const bool isSmall = Build(database);
    const bool isFast = CompareWithScan(database, rows);
    const bool isWarmKept = CompareProgram(database, rows);
    const bool isViewerKept = CompareViewers(database, rows);
    const bool isStartKept = CompareStart(database);
    return CompareCold(database, rows) && isViewerKept && isStartKept && isWarmKept && isFast && isSmall ? 0
                                                                                                         : 1;
}
