// Which SQL finds a word fastest? The forms that a search keyword could take, each as the time of one count
// over a table of log messages, compared with the form that GenSQLRegexp chose.
//
//   keyword_forms [ROWS]      1,000,000 rows of about 100 bytes unless given

#include <sqlite3.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>
#include <string_view>
#include <vector>

#include "keloplatform/gensqlregexp.h"
#include "keloplatform/kelodb.h"

namespace {

constexpr int kRounds = 5;

// The simplest function of one's own: the least that any could cost.
void Contains(sqlite3_context *context, int, sqlite3_value **arguments) {
    const auto view = [](sqlite3_value *value) {
        const auto *text = reinterpret_cast<const char *>(sqlite3_value_text(value));
        return std::string_view(text != nullptr ? text : "", static_cast<size_t>(sqlite3_value_bytes(value)));
    };
    const std::string_view text = view(arguments[0]);
    const std::string_view word = view(arguments[1]);
    sqlite3_result_int(context, memmem(text.data(), text.size(), word.data(), word.size()) != nullptr);
}

double CountMs(DBConnect_tag *connection, const std::string &condition) {
    double best = 1e9;
    for (int round = 0; round < kRounds; ++round) {
        const auto start = std::chrono::steady_clock::now();
        DBResult_tag *result = nullptr;
        const std::string sql = "SELECT count(*) FROM logs WHERE " + condition;
        if (KELODBExecute(connection, sql.c_str(), &result) != 0) {
            std::fprintf(stderr, "%s: %s\n", sql.c_str(), KELODBErrorGet(connection));
            std::exit(1);
        }
        KELODBFreeResult(result);
        const std::chrono::duration<double, std::milli> spent = std::chrono::steady_clock::now() - start;
        best = std::min(best, spent.count());
    }
    return best;
}

// A connection to an empty file that has no name any more.
DBConnect_tag *ConnectToScratchFile() {
    std::string path = std::filesystem::temp_directory_path() / "keyword_forms-XXXXXX";
    const int file = mkstemp(path.data());
    if (file < 0)
        return nullptr;
    close(file);
    DBConnect_tag *connection = KELODBConnect(nullptr, nullptr, nullptr, path.c_str());
    KELODBExecute(connection, "PRAGMA journal_mode=MEMORY", nullptr);
    unlink(path.c_str());
    return connection;
}

void Fill(DBConnect_tag *connection, int rows) {
    const std::string numbers = "WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < " +
                                std::to_string(rows) + ") ";
    KELODBExecute(connection, "CREATE TABLE logs(id INTEGER PRIMARY KEY, msg TEXT)", nullptr);
    KELODBExecute(connection,
                  (numbers +
                   "INSERT INTO logs(msg) SELECT printf('sshd[%d]: Connection from 10.1.%d.%d port %d "
                   "closed by remote host, session %d %s', i % 32768, i / 256 % 256, i % 256, i % 65536, "
                   "i, iif(i % 50000 = 0, 'Segfault', 'ended as usual')) FROM n")
                      .c_str(),
                  nullptr);
}

void Compare(DBConnect_tag *connection, const std::string &keyword, const std::vector<std::string> &others) {
    const std::string chosen = GenSQLRegexp(keyword, "msg");
    const double chosenMs = CountMs(connection, chosen);
    std::printf("keyword %s\n  1.00  %7.1f ms  %s\n", keyword.c_str(), chosenMs, chosen.c_str());
    for (const std::string &other : others) {
        const double ms = CountMs(connection, other);
        std::printf("  %.2f  %7.1f ms  %s\n", ms / chosenMs, ms, other.c_str());
    }
}

} // namespace

int main(int argc, char **argv) {
    const int rows = argc > 1 ? std::atoi(argv[1]) : 1'000'000;
    DBConnect_tag *connection = ConnectToScratchFile();
    if (connection == nullptr) {
        std::fputs("keyword_forms: no scratch file\n", stderr);
        return 1;
    }
    sqlite3_create_function_v2(KELODBInternalDBHdlGet(connection), "contains", 2,
                               SQLITE_UTF8 | SQLITE_DETERMINISTIC, nullptr, Contains, nullptr, nullptr,
                               nullptr);
    Fill(connection, rows);
    std::printf("%d rows, best of %d; ratios to what GenSQLRegexp chose\n", rows, kRounds);
    Compare(connection, "Segfault",
            {"instr(msg, 'Segfault') > 0", "contains(msg, 'Segfault')", "regexp('Segfault', msg)"});
    Compare(connection, "segfault", {"instr(lower(msg), 'segfault') > 0", "regexpi('segfault', msg)"});
    Compare(connection, "[9999]",
            {"msg GLOB '*[[]9999]*'", "msg LIKE '%[9999]%'", "contains(msg, '[9999]')"});
    Compare(connection, "-Segfault", {"msg NOT GLOB '*Segfault*'"});
    Compare(connection, "/session 9+ /", {"msg LIKE '%session 9%'"});
    KELODBClose(connection);
    return 0;
}
