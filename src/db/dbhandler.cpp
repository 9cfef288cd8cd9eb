#include "kelosyslog/dbhandler.h"

#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <new>
#include <utility>

#include "common/db_handles.h"
#include "common/failure.h"
#include "common/report.h"
#include "db/catalogue.h"
#include "db/creation.h"
#include "db/database_lock.h"
#include "db/first_row.h"
#include "keloplatform/kelodb.h"
#include "keloplatform/torvc.h"
#include "kelosyslog/debuger.h"

namespace {

// Far more than the processes that could move one database after the other while another connects.
constexpr int kConnectTries = 100;

// The platform would run the part in front of a NUL byte: a DELETE without its condition, for example.
bool IsWhole(const std::string &dbPath, const std::string &sql) {
    if (sql.find('\0') == std::string::npos)
        return true;
    kelo::Fail(KELO_FAILURE_ARGUMENT, dbPath, sql, "the statement holds a NUL byte");
    kelo::ReportErrorAt("dbhandler", __LINE__,
                        std::string("Fail to execute SQL command: ") + sql.c_str() +
                            ", it is followed by a NUL byte and " +
                            std::to_string(sql.size() - std::strlen(sql.c_str()) - 1) + " more");
    return false;
}

// The inode of what has the name; 0 for nothing.
ino_t InodeOf(const std::string &path) {
    struct stat status {};
    return stat(path.c_str(), &status) == 0 ? status.st_ino : 0;
}

} // namespace

DBHandler::DBHandler(std::string dbPath, std::string schemaPath)
    : schemaPath_(std::move(schemaPath)), dbPath_(std::move(dbPath)) {}

int DBHandler::DBCon() {
    if (connection_ != nullptr) {
        kelo::Fail(KELO_FAILURE_ARGUMENT, dbPath_, "DBCon", "it is connected already");
        Debuger::MSG(0, "Connection is already existed");
        return -1;
    }
    // What is moved or removed while this connects is no reason to fail: what comes after it is connected to.
    bool isMoving = true; // whenever this ends without another reason
    for (int tries = 0; tries < kConnectTries; ++tries) {
        const bool isThere = TORVCFileExist(dbPath_.c_str()) && !kelo::IsEmptyFile(dbPath_);
        if (isThere) {
            isMoving = kelo::AwaitCreation(dbPath_, schemaPath_);
            if (!isMoving)
                break;
        } else {
            Debuger::MSG(2, "Database is not existed: " + dbPath_);
            if (kelo::CreateDatabase(dbPath_, schemaPath_, kelo::Creation::kIfMissing) != 0) {
                Debuger::MSG(0, "Fail to create database: " + dbPath_);
                return -1;
            }
        }
        const ino_t tried = InodeOf(dbPath_);
        kelo::DbConnection connection = kelo::ConnectOrFail(dbPath_);
        if (connection == nullptr && TORVCFileExist(dbPath_.c_str()) && InodeOf(dbPath_) == tried) {
            isMoving = false;
            break;
        }
        // What is being created has no tables yet.
        const bool isUnfinished =
            kelo::DatabaseLock::IsTaken(dbPath_) || (isThere && kelo::IsEmptyFile(dbPath_));
        if (connection != nullptr && !isUnfinished) {
            connection_ = connection.release();
            return 0;
        }
    }
    if (isMoving)
        kelo::Fail(KELO_FAILURE_BUSY, dbPath_, "DBCon", "others keep creating, moving or removing it");
    Debuger::MSG(0, "Fail to open db: " + dbPath_);
    return -1;
}

int DBHandler::DBCreate() {
    return kelo::CreateDatabase(dbPath_, schemaPath_, kelo::Creation::kAlways);
}

int DBHandler::DBDiscon() {
    if (connection_ != nullptr)
        KELODBClose(std::exchange(connection_, nullptr));
    return 0;
}

bool DBHandler::isConnected() const {
    return connection_ != nullptr;
}

int32_t DBHandler::isInTran() const {
    return inTransaction_;
}

int DBHandler::DBExecute(std::string sql, DBHandlerCallback callback, void *context) {
    if (connection_ == nullptr) {
        Debuger::MSG(0, "DB is not connected");
        return kelo::FailStatement(nullptr, dbPath_, sql);
    }
    if (!IsWhole(dbPath_, sql))
        return -1;
    DBResult_tag *raw = nullptr;
    if (KELODBExecute(connection_, sql.c_str(), &raw) < 0) {
        kelo::FailStatement(connection_, dbPath_, sql);
        const kelo::FailureKeeper keeper;
        DBErrorHandle(sql);
        return -1;
    }
    const kelo::DbResult result(raw);
    if (callback != nullptr)
        callback(result.get(), context);
    return 0;
}

int DBHandler::DBExecute(std::string sql) {
    if (connection_ == nullptr)
        return kelo::FailStatement(nullptr, dbPath_, sql);
    if (!IsWhole(dbPath_, sql))
        return -1;
    if (KELODBExecute(connection_, sql.c_str(), nullptr) < 0) {
        kelo::FailStatement(connection_, dbPath_, sql);
        const kelo::FailureKeeper keeper;
        DBErrorHandle(sql);
        return -1;
    }
    return 0;
}

int DBHandler::RunTransactionStatement(const char *operation, int32_t forbiddenFlag, const char *sql,
                                       const char *failure) {
    if (connection_ == nullptr || inTransaction_ == forbiddenFlag) {
        Debuger::MSG(0, std::string("Fail to check sanity (") + operation + ")");
        return kelo::Fail(KELO_FAILURE_ARGUMENT, dbPath_, sql,
                          connection_ == nullptr ? "not connected"
                                                 : "the in-transaction flag does not allow it");
    }
    // Where SQLite has rolled back by itself, what made it do so is the failure to know.
    const bool isOver =
        forbiddenFlag == 0 && sqlite3_get_autocommit(KELODBInternalDBHdlGet(connection_)) != 0;
    if (KELODBExecute(connection_, sql, nullptr) < 0) {
        if (!isOver || SyslogFailureGet()->kind == KELO_FAILURE_NONE)
            kelo::FailStatement(connection_, dbPath_, sql);
        Debuger::MSG(0, failure);
        return -1;
    }
    return 0;
}

int DBHandler::DBTranStart() {
    if (RunTransactionStatement("DBTranStart", 1, "BEGIN;", "Fail to begin transaction") != 0)
        return -1;
    inTransaction_ = 1;
    return 0;
}

int DBHandler::DBTranEnd() {
    if (RunTransactionStatement("DBTranEnd", 0, "END;", "Fail to end transaction") != 0)
        return -1;
    inTransaction_ = 0;
    return 0;
}

int DBHandler::DBTranRollback() {
    if (RunTransactionStatement("DBTranRollback", 0, "ROLLBACK;", "Fail to rollback transaction") != 0)
        return -1;
    inTransaction_ = 0;
    return 0;
}

std::string DBHandler::DBCmdEscape(std::string text) {
    const size_t size = 2 * text.size() + 1;
    const std::unique_ptr<char[]> escaped(new (std::nothrow) char[size]);
    if (escaped == nullptr) {
        kelo::FailWithErrno(dbPath_, "DBCmdEscape", ENOMEM);
        Debuger::MSG(0, "Fail to allocate memory");
        return "";
    }
    errno = 0;
    if (KELODBEscapeStringEX(connection_, escaped.get(), size, text.c_str(), text.size()) < 0) {
        kelo::FailPlatform(dbPath_, "KELODBEscapeStringEX");
        Debuger::MSG(0, "Fail to escapse string");
        return "";
    }
    return escaped.get();
}

int DBHandler::DBWalCheckpoint(bool removeFiles) {
    if (KELODBExecute(connection_, "PRAGMA wal_checkpoint(FULL);", nullptr) < 0) {
        kelo::FailStatement(connection_, dbPath_, "PRAGMA wal_checkpoint(FULL);");
        Debuger::MSG(0, "Fail to force WAL checkpoint(FULL)");
        return -1;
    }
    if (removeFiles) {
        unlink((dbPath_ + "-wal").c_str());
        unlink((dbPath_ + "-shm").c_str());
    }
    return 0;
}

bool DBHandler::DBcheckTableExist(std::string table) {
    const std::string sql = kelo::CatalogueQuery(table);
    int32_t count = 0;
    const auto readCount = [](DBResult_tag *result, void *context) {
        uint32_t row = 0;
        if (kelo::FirstRow(result, row))
            *static_cast<int32_t *>(context) = kelo::ParseInt32(kelo::FieldText(result, row, "count_result"));
        return 0;
    };
    if (DBExecute(sql, readCount, &count) != 0) {
        Debuger::MSG(0, "Fail to execute SQL command : " + sql);
        return false;
    }
    return count != 0;
}
