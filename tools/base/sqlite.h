#pragma once

// Plain SQLite, for what the library has no operation for: a connection, a statement and a transaction that
// end with their scope.
//
//     SqliteConnection database("/volume1/logs.db", {.mode = SqliteMode::kWrite});
//     SqliteTransaction transaction(database);
//     SqliteStatement remove(database, "DELETE FROM logs WHERE host = ?1");
//     remove.Bind(1, host);
//     remove.Run();
//     transaction.Commit();
//
// All functions throw SqliteError. One thread at a time uses a connection with what belongs to it.

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

#include "base/errors.h"

struct sqlite3;
struct sqlite3_stmt;

namespace kelo::tool {

// What SQLite said of a database. The text names the path and the cause.
struct SqliteError : DatabaseError {
    SqliteError(const std::string &text, int code, int systemError)
        : DatabaseError(text), code(code), systemError(systemError) {}
    int code;        // SQLite's primary result code
    int systemError; // errno of the file operation that failed, else 0
};

enum class SqliteMode {
    kRead,
    kWrite, // a file of which only reading is permitted is opened for reading
    kCreate // the same, and a file that is missing is created
};

struct SqliteOptions {
    SqliteMode mode = SqliteMode::kRead;
    // How long a statement waits for a locked database.
    int busyTimeoutMs = 10'000;
    // Whatever runs ends early, and throws Interrupted, when one of StopSignals came.
    bool heedsStopSignals = false;
    // Without it the schema that the file holds does nothing but store.
    bool trustsSchema = true;
};

class SqliteConnection {
public:
    // Opens the file at the absolute `path`. Errors call it `name`, where one is given.
    SqliteConnection(const std::string &path, const SqliteOptions &options, std::string name = "");
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

    // Copies the write-ahead log into the file as far as possible; empties it if nobody uses it and
    // `mustEmpty` says so. Without effect, and without an error, where others are in the way.
    void Checkpoint(bool mustEmpty);
    // Whether the file was removed or renamed since it was opened.
    bool HasMoved() const;

    const std::string &Name() const { return name_; }
    // For operations that have no function here.
    sqlite3 *Get() const { return db_.get(); }
    // Throws for SQLite's result `status`, with the words of the last error.
    [[noreturn]] void Fail(int status) const;

private:
    struct Close {
        void operator()(sqlite3 *db) const;
    };
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
    // The value that `row` has in `column`, with its type.
    void BindColumn(int index, const SqliteStatement &row, int column);

    // Goes to the next row; returns whether there is one.
    bool Step();
    // Runs to the end, drops the rows, and is ready for other values, also when it throws.
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

// Keeps other writers out from its construction on. What was not committed when it ends is undone.
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

// Removes a database with what SQLite puts beside it, as far as it is there.
void RemoveDatabase(const std::string &path);

} // namespace kelo::tool
