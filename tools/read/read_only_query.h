#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "base/sqlite.h"
#include "keloplatform/skip_index.h"
#include "read/log_table.h"

struct DBConnect_tag;
struct sqlite3_value;

namespace kelo::tool {

// A connection that only reports errors: unlike a DBHandler it creates no file and quarantines none.
class ReadOnlyQuery {
public:
    // Throws DatabaseError when the file cannot be opened.
    explicit ReadOnlyQuery(LogTable table);
    // With a time limit: a statement fails that waits for a lock, or works, for longer than `timeout`
    // (SQLITE_BUSY, SQLITE_INTERRUPT), and closing leaves the rows of a write-ahead log to others.
    ReadOnlyQuery(LogTable table, std::chrono::milliseconds timeout);
    ReadOnlyQuery(const ReadOnlyQuery &) = delete;
    ReadOnlyQuery &operator=(const ReadOnlyQuery &) = delete;

    // The values of these columns, of all rows or of the first; none without a row. NULL is "". These and the
    // others throw SqliteError.
    using Row = std::vector<std::string>;
    std::vector<Row> Rows(const std::string &sql, const std::vector<std::string> &columns) const;
    std::optional<Row> FirstRow(const std::string &sql, const std::vector<std::string> &columns) const;
    std::vector<std::string> Column(const std::string &sql, const std::string &column) const;
    // The first row's column "value" as a number; 0 without one.
    int64_t Number(const std::string &sql) const;
    bool HasTable(const std::string &table) const;
    // Passes each row of "SELECT `columns` FROM `from`" to `handle` while the statement runs, so that no
    // result is kept. What `handle` throws ends it and is passed on.
    class Values;
    using RowHandler = std::function<void(const Values &row)>;
    void ForEach(const std::string &columns, const std::string &from, const RowHandler &handle) const;
    // What the index for keywords knows.
    KELODBSkipIndex SkipIndex() const;
    // Throws DatabaseError if the connection's table is a view or virtual: reading it can take any time, and
    // nothing of ours creates one.
    void RequireTable() const;

private:
    struct Closer {
        void operator()(DBConnect_tag *connection) const;
    };
    static int IsPastDeadline(void *database);

    LogTable table_;
    std::chrono::milliseconds timeout_{0};
    mutable std::chrono::steady_clock::time_point deadline_; // of the statement that runs
    std::unique_ptr<DBConnect_tag, Closer> connection_;
};

// The values of a row while its handler runs.
class ReadOnlyQuery::Values {
public:
    explicit Values(sqlite3_value **values) : values_(values) {}

    // A text up to its first NUL byte, as in other results; a number as text, and NULL as "".
    std::string_view Text(int column) const;
    // A number, without its fraction; nothing for other types.
    std::optional<int64_t> Number(int column) const;

private:
    sqlite3_value **values_;
};

} // namespace kelo::tool
