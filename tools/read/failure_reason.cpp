#include "read/failure_reason.h"

#include <sqlite3.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <memory>

#include "keloplatform/kelodb.h"
#include "keloplatform/kelosystem.h"

namespace kelo::tool {
namespace {

constexpr int kTimeoutMs = 1000; // the caller has already waited for a lock

struct Closer {
    void operator()(DBConnect_tag *connection) const { KELODBClose(connection); }
};

std::string ErrorOf(const std::string &path) {
    return path + ": " + std::strerror(errno);
}

} // namespace

std::string WhyStatementFails(const std::string &path, const std::string &sql) {
    const std::unique_ptr<DBConnect_tag, Closer> connection(
        KELODBConnect(nullptr, nullptr, nullptr, path.c_str()));
    if (connection == nullptr)
        return access(path.c_str(), R_OK) != 0 ? std::strerror(errno) : "it cannot be opened";
    sqlite3_busy_timeout(KELODBInternalDBHdlGet(connection.get()), kTimeoutMs);
    for (const std::string &statement : {std::string("BEGIN"), sql, std::string("ROLLBACK")}) {
        if (KELODBExecute(connection.get(), statement.c_str(), nullptr) < 0)
            return KELODBErrorGet(connection.get());
    }
    return "it was locked or damaged a moment ago; see the system log";
}

std::string WhyNotCreated(const std::string &path, const std::string &schema) {
    const std::string folder = path.substr(0, path.rfind('/'));
    if (KELOFSMkdirP(folder.c_str(), 0, 1, -1, -1, 0777) < 0 || access(folder.c_str(), W_OK) != 0)
        return ErrorOf(folder);
    if (access(schema.c_str(), R_OK) != 0)
        return ErrorOf(schema);
    return "the sqlite3 tool cannot make it from " + schema;
}

} // namespace kelo::tool
