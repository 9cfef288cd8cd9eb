#pragma once

// Plain SQLite, where the library has no operation: a connection, a statement and a transaction that end with
// their scope.
//
//     SqliteConnection database("/volume1/logs.db", {.mode = SqliteMode::kWrite});
//     SqliteTransaction transaction(database);
//     SqliteStatement remove(database, "DELETE FROM logs WHERE host = ?1");
//     remove.Bind(1, host);
//     remove.Run();
//     transaction.Commit();
//
// All functions throw SqliteError. One thread at a time uses a connection and its objects.

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <utility>

#include "base/errors.h"

struct sqlite3;
struct sqlite3_stmt;

namespace kelo::tool {

// An error of SQLite. The text names the path and the cause.
struct SqliteError : DatabaseError {
    SqliteError(const std::string &text, int code, int systemError)
        : DatabaseError(text), code(code), systemError(systemError) {}
    int code;        // SQLite's primary result code
    int systemError; // errno of the file operation that failed, else 0
};

enum class SqliteMode {
    kRead,
    kWrite, // a read-only file is opened for reading
    kCreate // the same, and a missing file is created
};

struct SqliteOptions {
    SqliteMode mode = SqliteMode::kRead;
    // How long a statement waits for a locked database.
    int busyTimeoutMs = 10'000;
    // A running operation ends early, and throws Interrupted, after one of StopSignals.
    bool heedsStopSignals = false;
    // Without it the schema of the file can only store: its triggers and views call no functions with
    // effects.
    bool trustsSchema = true;
};

class SqliteConnection {
public:
    // Opens the file at the absolute `path`. Errors use `name`, if one is given.
    SqliteConnection(const std::string &path, const SqliteOptions &options, const std::string &name = "");
    // Works on a connection that somebody else has opened and closes later.
    SqliteConnection(sqlite3 *db, std::string name) : name_(std::move(name)), db_(db, {.isBorrowed = true}) {}
    SqliteConnection(const SqliteConnection &) = delete;
    SqliteConnection &operator=(const SqliteConnection &) = delete;

    void SetBusyTimeout(int timeoutMs);

    // Runs any number of statements, and drops their rows. Here and below `value` is that of ?1, with which
    // there is one statement.
    void Run(const std::string &sql);
    void Run(const std::string &sql, std::string_view value);
    // The first column of the first row; 0 and "" without one.
    int64_t Number(const std::string &sql);
    int64_t Number(const std::string &sql, std::string_view value);
    std::string Text(const std::string &sql);
    // Rows that the last INSERT, UPDATE or DELETE changed.
    uint64_t Changes() const;

    // Copies the write-ahead log into the file as far as possible; empties it if it is unused and
    // `mustEmpty` says so. Without effect, and without an error, if others prevent it.
    void Checkpoint(bool mustEmpty);
    // Whether the file was removed or renamed since it was opened.
    bool HasMoved() const;

    const std::string &Name() const { return name_; }
    // For operations without a function here.
    sqlite3 *Get() const { return db_.get(); }
    // Throws for SQLite's result `status`, with the words of the last error.
    [[noreturn]] void Fail(int status) const;

private:
    struct Close {
        bool isBorrowed; // false unless it is set
        void operator()(sqlite3 *db) const;
    };
    void Open(const std::string &path);
    bool OpenLog();
    static int WaitForLock(void *connection, int calls);

    std::string name_;
    SqliteOptions options_;
    std::unique_ptr<sqlite3, Close> db_;
};

class SqliteStatement {
public:
    // The connection must outlive the statement.
    SqliteStatement(SqliteConnection &connection, const std::string &sql);

    // Sets the value of ?1, ?2 and so on. A text must outlive the run.
    void Bind(int index, std::string_view text);
    void Bind(int index, int64_t number);
    void BindBlob(int index, std::string_view bytes);
    // The value in `column` of `row`, with its type.
    void BindColumn(int index, const SqliteStatement &row, int column);

    // Advances to the next row; returns whether there is one.
    bool Step();
    // Runs to the end and drops the rows. It can then be run with other values, also after an exception.
    void Run();

    // Of the row. NULL is 0 and "". A text ends at its first NUL.
    int64_t Number(int column) const;
    std::string Text(int column) const;
    std::string Blob(int column) const;

private:
    struct Finalize {
        void operator()(sqlite3_stmt *statement) const;
    };
    void Require(int status) const;

    SqliteConnection *connection_;
    std::unique_ptr<sqlite3_stmt, Finalize> statement_;
};

// Locks other writers out from its construction on. What was not committed at its end is rolled back.
class SqliteTransaction {
public:
    explicit SqliteTransaction(SqliteConnection &connection);
    ~SqliteTransaction();
    SqliteTransaction(const SqliteTransaction &) = delete;
    SqliteTransaction &operator=(const SqliteTransaction &) = delete;

    void Commit();

private:
    SqliteConnection &connection_;
    bool isOpen_ = true;
};

// Removes a database with its existing companion files.
void RemoveDatabase(const std::string &path);

} // namespace kelo::tool
