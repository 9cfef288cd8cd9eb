#pragma once

// The library in the manner of C++20: exceptions with a reason, a transaction that ends with its scope, and
// any callable for the rows of a search. Copy what you need.

#include <kelosyslog/dbhandler.h>
#include <kelosyslog/dbreader.h>
#include <kelosyslog/failure.h>

#include <concepts>
#include <exception>
#include <stdexcept>
#include <utility>

// The thread's last failure.
struct Failure : std::runtime_error {
    Failure() : std::runtime_error(std::string(SyslogFailureGet()->path) + ": " + SyslogFailureGet()->text) {}
    KELOFAILUREKIND kind = SyslogFailureGet()->kind;
};

// Throws Failure if a result of the library says that it failed.
inline int Check(int result) {
    return result < 0 ? throw Failure() : result;
}

// A connected handler, which disconnects with its scope.
class Database {
public:
    Database(std::string path, std::string schema) : db_(std::move(path), std::move(schema)) {
        Check(db_.DBCon());
    }
    DBHandler *operator->() { return &db_; }

private:
    DBHandler db_;
    DBConnectionScope scope_{db_};
};

// Statements that take effect together at Commit; otherwise, also after an exception, none does.
class Transaction {
public:
    explicit Transaction(Database &db) : db_(db) { Check(db_->DBTranStart()); }
    ~Transaction() {
        if (!isCommitted_)
            db_->DBTranRollback();
    }
    Transaction(const Transaction &) = delete;
    Transaction &operator=(const Transaction &) = delete;
    void Commit() {
        Check(db_->DBTranEnd());
        isCommitted_ = true;
    }

private:
    Database &db_;
    bool isCommitted_ = false;
};

// Calls `take` with each record. It may throw, and may return false to end the search.
template <std::invocable<_SYSLOG_LOG_DATA_tag &> Take>
void ForEachLog(SyslogDBReader &reader, const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                const _SYSLOG_SQL_LIMIT_tag &page, const _SYSLOG_SQL_ORDER_tag &order, Take take) {
    struct Walk {
        Take &take;
        std::exception_ptr exception;
    } walk{take, nullptr};
    const auto callback = [](_SYSLOG_LOG_DATA_tag &log, void *context) {
        auto &walk = *static_cast<Walk *>(context);
        try {
            if constexpr (std::same_as<decltype(walk.take(log)), bool>)
                return walk.take(log) ? 0 : 1;
            walk.take(log);
            return 0;
        } catch (...) {
            walk.exception = std::current_exception();
            return 1;
        }
    };
    const int result = reader.Select(conditions, &page, &order, callback, &walk, false);
    if (walk.exception != nullptr)
        std::rethrow_exception(walk.exception);
    Check(result);
}
