#include "store/write_transaction.h"

#include <cerrno>

#include "common/failure.h"
#include "keloplatform/kelodb.h"

namespace kelo {

int RunStatement(DBConnect_tag *connection, const std::string &dbPath, const std::string &sql) {
    errno = 0; // the value of an earlier operation is not the reason of this failure
    if (KELODBExecute(connection, sql.c_str(), nullptr) >= 0)
        return 0;
    return FailStatement(connection, dbPath, sql, errno);
}

int WriteTransaction::Begin() {
    if (RunStatement(connection_, dbPath_, "BEGIN IMMEDIATE") != 0)
        return -1;
    isOpen_ = true;
    return 0;
}

int WriteTransaction::Commit() {
    if (RunStatement(connection_, dbPath_, "COMMIT") != 0)
        return -1;
    isOpen_ = false;
    return 0;
}

WriteTransaction::~WriteTransaction() {
    if (isOpen_) // SQLite may have rolled it back already
        KELODBExecute(connection_, "ROLLBACK", nullptr);
}

} // namespace kelo
