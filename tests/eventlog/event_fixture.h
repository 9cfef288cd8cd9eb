#pragma once

#include "kelosyslog/logger.h"
#include "support/test.h"

namespace kelo::test {

using Lines = std::vector<std::string>;

// A root with the shipped schema in it.
class EventTest : public LibraryTest {
protected:
    EventTest() { WriteFile(root_.File("usr/kelo/syslog/schema/kelosyslog.sql"), schema_); }

    // Creates the server's database with `rows` events at the times 1000, 1001, 1002, ...
    void CreateEvents(int rows) const {
        fs::create_directories(fs::path(db_).parent_path());
        RunSql(db_, "PRAGMA journal_mode=WAL; PRAGMA synchronous=OFF;" + schema_ +
                        "WITH n(i) AS (SELECT 0 UNION ALL SELECT i + 1 FROM n WHERE i + 1 < " +
                        std::to_string(rows) +
                        ") INSERT INTO log SELECT NULL, 0, 1000 + i, 'SYSTEM', 'event ' || i FROM n");
    }
    std::string Query(const std::string &sql) const { return RunSql(db_, sql); }
    std::string Rows() const { return Query("SELECT count(*) FROM log"); }

    const std::string schema_ = ReadFile(BuildPath("package/schema/kelosyslog.sql"));
    const std::string db_ = root_.File("usr/kelo/etc/kelosyslog.db");
    Logger logger_;
};

} // namespace kelo::test
