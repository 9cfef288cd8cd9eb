#include "support/log_database.h"

#include <sqlite3.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <functional>
#include <memory>
#include <sstream>

#include "support/measure.h"

namespace kelo::bench {
namespace {

namespace fs = std::filesystem;

constexpr char kRows[] = R"sql(
WITH n(i) AS (SELECT 0 UNION ALL SELECT i + 1 FROM n WHERE i + 1 < $rows)
INSERT INTO logs(host, ip, fac, prio, llevel, tag, utcsec, tzoffset, ldate, ltime, prog, msg)
SELECT printf('host%02d', i % 50), '10.0.0.' || (i % 50),
    CASE i % 4 WHEN 0 THEN 'daemon' WHEN 1 THEN 'auth' WHEN 2 THEN 'kern' ELSE 'local0' END,
    CASE WHEN i % 40 = 0 THEN 'err' WHEN i % 10 = 0 THEN 'warning' ELSE 'info' END,
    CASE WHEN i % 40 = 0 THEN 'err' WHEN i % 10 = 0 THEN 'warning' ELSE 'info' END,
    '86', 1577836800 + i, '+00:00', strftime('%Y/%m/%d', 1577836800 + i, 'unixepoch'),
    strftime('%H:%M:%S', 1577836800 + i, 'unixepoch'), printf('prog%02d', i % 30),
    'user' || (i % 97) || ': request ' || i || ' from 192.168.1.' || (i % 254) || ' took ' || (i % 1000) || ' ms, status ' ||
    CASE WHEN i % 13 = 0 THEN 'FAILED' ELSE 'done' END || ', session closed normally'
FROM n)sql";

std::string SchemaText() {
    std::ostringstream text;
    text << std::ifstream(KELO_SCHEMA).rdbuf();
    return text.str();
}

void Make(const std::string &path, const std::string &schema, int rows) {
    sqlite3 *db = nullptr;
    const int status = sqlite3_open(path.c_str(), &db);
    const std::unique_ptr<sqlite3, int (*)(sqlite3 *)> owner(db, sqlite3_close);
    std::string insertion = kRows;
    insertion.replace(insertion.find("$rows"), 5, std::to_string(rows));
    const std::string sql = "PRAGMA journal_mode=WAL; PRAGMA synchronous=OFF;" + schema + insertion;
    if (status != SQLITE_OK || sqlite3_exec(db, sql.c_str(), nullptr, nullptr, nullptr) != SQLITE_OK)
        Fail(path + ": " + sqlite3_errmsg(db));
}

} // namespace

std::string LogDatabase(int rows) {
    const fs::path folder = fs::temp_directory_path() / ("kelosyslog-bench-" + std::to_string(getuid()));
    fs::create_directories(folder);
    fs::permissions(folder, fs::perms::owner_all);
    const std::string schema = SchemaText();
    const size_t contents = std::hash<std::string>()(schema + kRows); // other contents, other file
    std::string path = folder / ("logs-" + std::to_string(rows) + "-" + std::to_string(contents) + ".db");
    if (!fs::exists(path)) {
        const std::string unfinished = path + "." + std::to_string(getpid());
        Make(unfinished, schema, rows);
        fs::rename(unfinished, path);
    }
    return path;
}

} // namespace kelo::bench
