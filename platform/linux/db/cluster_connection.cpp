#include "db/cluster_connection.h"

#include <algorithm>
#include <string_view>
#include <utility>

#include "common/failure.h"
#include "db/raise_error.h"
#include "db/result.h"
#include "keloplatform/cluster.h"
#include "keloplatform/vfs.h"

namespace kelo::platform {
namespace {

// Collects the rows of an answer.
class ResultTaker final : public RowTaker {
public:
    void TakeColumns(const std::vector<std::string> &names) override {
        result_ = std::make_unique<DBResult_tag>(names);
    }
    void TakeRow(std::span<const std::string> values) override {
        for (size_t column = 0; column < values.size(); ++column)
            result_->cells[column] = {values[column].c_str(),
                                      std::string_view(values[column].c_str()).size()};
        result_->AddRow();
    }
    std::unique_ptr<DBResult_tag> Release() { return std::move(result_); }

private:
    std::unique_ptr<DBResult_tag> result_; // null for a statement without columns
};

// The code of SQLite that stands for the kind of failure.
int CodeOf(KELOFAILUREKIND kind) {
    switch (kind) {
    case KELO_FAILURE_BUSY:
        return SQLITE_BUSY;
    case KELO_FAILURE_PERMISSION:
        return SQLITE_PERM;
    case KELO_FAILURE_IO:
        return SQLITE_IOERR;
    case KELO_FAILURE_MEMORY:
        return SQLITE_NOMEM;
    default:
        return SQLITE_ERROR;
    }
}

} // namespace

bool DescribesCluster(sqlite3 *db) {
    sqlite3_file *file = nullptr;
    char start[kClusterHeading.size()];
    return sqlite3_file_control(db, "main", SQLITE_FCNTL_FILE_POINTER, &file) == SQLITE_OK &&
           file != nullptr && file->pMethods != nullptr &&
           file->pMethods->xRead(file, start, sizeof start, 0) == SQLITE_OK &&
           std::string_view(start, sizeof start) == kClusterHeading;
}

DBConnect_tag *ConnectToCluster(std::unique_ptr<DBConnect_tag> connection, const char *path) {
    try {
        connection->cluster = std::make_unique<Cluster>(path);
    } catch (const ClusterError &error) {
        Fail(error.kind, "KELODBConnect", path, error.what());
        return nullptr;
    }
    sqlite3 *db = nullptr;
    const int status =
        sqlite3_open_v2(":memory:", &db, SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX, KELODBVfs());
    Database owner(db);
    if (status != SQLITE_OK)
        throw std::bad_alloc();
    connection->db = owner.release();
    return connection.release();
}

bool RunOnCluster(DBConnect_tag &connection, const char *sql, const PageBounds *page, DBResult_tag **result) {
    ResultTaker rows;
    try {
        const auto bounds =
            page != nullptr ? std::optional(Cluster::Page{page->limit, page->offset}) : std::nullopt;
        connection.cluster->Run(sql, bounds, rows);
    } catch (const ClusterError &error) {
        RaiseError(connection.db, CodeOf(error.kind), error.what());
        return false;
    }
    if (result != nullptr)
        *result = rows.Release().release();
    return true;
}

} // namespace kelo::platform

const char *KELODBClusterServerGet(DBConnect_tag *connection, unsigned int server) {
    if (connection == nullptr || connection->cluster == nullptr ||
        server >= connection->cluster->Servers().size())
        return nullptr;
    return connection->cluster->Servers()[server].c_str();
}

int KELODBClusterRun(DBConnect_tag *connection, unsigned int server, const char *statement, size_t size,
                     KELODBCLUSTERTAKER take, void *context) {
    using namespace kelo::platform;
    if (KELODBClusterServerGet(connection, server) == nullptr || statement == nullptr)
        return Fail(KELO_FAILURE_ARGUMENT, "KELODBClusterRun", "", "no such server of a cluster");
    try {
        connection->cluster->RunAsItIs(server, {statement, size}, [&](std::string_view part) {
            if (take != nullptr && take(part.data(), part.size(), context) != 0)
                throw ClusterError(KELO_FAILURE_OTHER, "its answer was not wanted");
        });
        return 0;
    } catch (const ClusterError &error) {
        RaiseError(connection->db, CodeOf(error.kind), error.what());
    } catch (const std::bad_alloc &) {
        RaiseError(connection->db, SQLITE_NOMEM, "out of memory");
    }
    constexpr size_t kShown = 200; // of a statement that may be followed by data
    return FailStatement(connection->db, {statement, std::min(size, kShown)});
}

int KELODBIsCluster(const char *path) {
    if (path == nullptr || path[0] == '\0')
        return 0;
    try {
        const kelo::platform::Database db = kelo::platform::DatabaseFile(path).Open();
        return db != nullptr && kelo::platform::DescribesCluster(db.get()) ? 1 : 0;
    } catch (const std::bad_alloc &) {
        return 0;
    }
}
