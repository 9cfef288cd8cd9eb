#pragma once

#include <sqlite3.h>

namespace kelo::platform {

// A transaction that is rolled back unless it is committed.
class Transaction {
public:
    Transaction(sqlite3 *db, const char *begin) : db_(db), isOpen_(Run(begin)) {}
    ~Transaction() {
        if (isOpen_)
            Run("ROLLBACK");
    }
    Transaction(const Transaction &) = delete;
    Transaction &operator=(const Transaction &) = delete;

    bool IsOpen() const { return isOpen_; }
    bool Commit() {
        isOpen_ = !Run("COMMIT");
        return !isOpen_;
    }

private:
    bool Run(const char *sql) { return sqlite3_exec(db_, sql, nullptr, nullptr, nullptr) == SQLITE_OK; }

    sqlite3 *db_;
    bool isOpen_;
};

} // namespace kelo::platform
