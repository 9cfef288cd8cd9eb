// Filtered counts and keyword searches, against the sqlite3 shell running the same SQL.
//
// The shell's own timer measures a statement, so that neither the start of its process nor
// the opening of the database counts for it; both sides then scan the same pages with the same SQLite.

#include <dlfcn.h>
#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <list>
#include <memory>
#include <string>

#include "keloplatform/kelodb.h"
#include "kelosyslog/dbutil.h"
#include "support/log_database.h"
#include "support/measure.h"

using namespace kelo::bench;

namespace {

constexpr int kRows = 1000000;
constexpr int kRounds = 9;
constexpr int kPageRows = 50;

using Conditions = std::list<_SYSLOG_SQL_COND_tag>;

std::string sentSql; // the last statement that the library sent

// Runs a statement in the shell and returns what its timer says, in milliseconds.
double TimeInShell(const std::string &database, const std::string &sql) {
    const std::string script = database + "." + std::to_string(getpid()) + ".sql";
    std::ofstream(script) << ".timer on\n.output /dev/null\n" << sql << ";\n";
    const std::string command = "sqlite3 -batch '" + database + "' < '" + script + "'";
    const std::unique_ptr<FILE, int (*)(FILE *)> shell(popen(command.c_str(), "r"), pclose);
    char line[256];
    double seconds = -1;
    while (shell != nullptr && std::fgets(line, sizeof line, shell.get()) != nullptr)
        std::sscanf(line, "Run Time: real %lf", &seconds);
    unlink(script.c_str());
    if (seconds < 0)
        Fail("the sqlite3 shell told no time for: " + sql);
    return seconds * 1000;
}

int CountRow(_SYSLOG_LOG_DATA_tag &, void *context) {
    ++*static_cast<int *>(context);
    return 0;
}

void Count(const std::string &database, const Conditions &conditions) {
    if (SyslogDBSelectCount(database, conditions, nullptr, nullptr) <= 0)
        Fail("nothing counted by: " + sentSql);
}

void SearchPage(const std::string &database, const Conditions &conditions) {
    _SYSLOG_SQL_LIMIT_tag page{kPageRows, 0};
    _SYSLOG_SQL_ORDER_tag newestFirst{0, SYSLOG_ATTRI_ID};
    int rows = 0;
    if (SyslogDBSelect(database, conditions, &page, &newestFirst, CountRow, &rows, false) != 0 || rows == 0)
        Fail("nothing found by: " + sentSql);
}

struct Search {
    const char *name;
    const char *program;
    const char *level;
    const char *keyword;
    void (*run)(const std::string &, const Conditions &);
    const char *bounds; // what the library adds to the statement it sends
};
constexpr Search kSearches[] = {
    {"count of a program's errors", "prog00,prog10", "err", "", Count, ""},
    {"count of a common word", "", "", "FAILED", Count, ""},
    {"count of a rare phrase", "", "", "\"request 54321 \"", Count, ""},
    {"page of a rare phrase", "", "", "\"took 77 ms, status FAILED\"", SearchPage, " LIMIT 50 OFFSET 0"},
};

} // namespace

// Replaces the platform's functions to record the statements.
int KELODBExecute(DBConnect_tag *connection, const char *sql, DBResult_tag **result) {
    sentSql = sql;
    static const auto real = reinterpret_cast<decltype(&KELODBExecute)>(dlsym(RTLD_NEXT, "KELODBExecute"));
    return real(connection, sql, result);
}

int KELODBSelectLimit(DBConnect_tag *connection, const char *sql, unsigned int limit, unsigned int offset,
                      DBResult_tag **result) {
    sentSql = sql;
    static const auto real =
        reinterpret_cast<decltype(&KELODBSelectLimit)>(dlsym(RTLD_NEXT, "KELODBSelectLimit"));
    return real(connection, sql, limit, offset, result);
}

int main() {
    const std::string database = LogDatabase(kRows);
    bool allKept = true;
    PrintHeading("Filtered searches in " + std::to_string(kRows) + " rows", "ms");
    for (const Search &search : kSearches) {
        Conditions conditions;
        LogSearchCondListGen("", search.level, "", search.program, search.keyword, "", "", conditions);
        const auto times =
            MedianTimes({{"library", [&] { return Time([&] { search.run(database, conditions); }); }},
                         {"shell", [&] { return TimeInShell(database, sentSql + search.bounds); }}},
                        kRounds);
        allKept = PrintRatio(search.name, times[0], "sqlite3 shell", times[1], 1.1) && allKept;
    }
    return allKept ? 0 : 1;
}
