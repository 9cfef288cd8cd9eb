#pragma once

#include "keloplatform/kelodb.h"
#include "support/test.h"

namespace kelo::test {

struct CloseConnection {
    void operator()(DBConnect_tag *connection) const { KELODBClose(connection); }
};
using Connection = std::unique_ptr<DBConnect_tag, CloseConnection>;

inline Connection ConnectTo(const std::string &path) {
    return Connection(KELODBConnect(nullptr, nullptr, nullptr, path.c_str()));
}

// What one call gave: its rows as texts, or the connection's error after it.
struct Outcome {
    int status = 0;
    bool hasResult = false;
    std::vector<std::vector<std::optional<std::string>>> rows;
    int errorCode = SQLITE_OK;
    std::string error;
};

// Runs a statement and reads the named columns of every row.
Outcome Execute(const Connection &connection, const std::string &sql,
                const std::vector<std::string> &columns = {});
Outcome SelectLimit(const Connection &connection, const std::string &sql, unsigned int limit,
                    unsigned int offset, const std::vector<std::string> &columns);

} // namespace kelo::test
