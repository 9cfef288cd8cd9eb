#pragma once

#include <memory>
#include <string>

#include "keloplatform/kelodb.h"

namespace kelo {

struct DbConnectionCloser {
    void operator()(DBConnect_tag *connection) const { KELODBClose(connection); }
};
struct DbResultFreer {
    void operator()(DBResult_tag *result) const { KELODBFreeResult(result); }
};

// A connection that closes, and a result that frees, when it goes out of scope. Declare the result after the
// connection.
using DbConnection = std::unique_ptr<DBConnect_tag, DbConnectionCloser>;
using DbResult = std::unique_ptr<DBResult_tag, DbResultFreer>;

// Opens the database at `path`; null on failure. A path with a NUL byte would name another file and fails.
inline DbConnection Connect(const std::string &path) {
    if (path.find('\0') != std::string::npos)
        return nullptr;
    return DbConnection(KELODBConnect(nullptr, nullptr, nullptr, path.c_str()));
}

} // namespace kelo
