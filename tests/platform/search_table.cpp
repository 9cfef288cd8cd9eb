#include "platform/search_table.h"

#include <sqlite3.h>

#include <stdexcept>

#include "keloplatform/gensqlregexp.h"
#include "keloplatform/kelodb.h"
#include "support/log_database.h"

namespace kelo::test {

SearchTable::SearchTable(const std::vector<std::string> &texts) : texts_(texts) {
    const std::string path = root_.File("logs.db");
    RunSql(path, "CREATE TABLE logs(id INTEGER PRIMARY KEY, msg TEXT); INSERT INTO logs VALUES(0, NULL)");
    connection_ = KELODBConnect(nullptr, nullptr, nullptr, path.c_str());
    if (connection_ == nullptr)
        throw std::runtime_error("no connection to " + path);
    Run("PRAGMA synchronous=OFF");
    Run("BEGIN");
    sqlite3_stmt *insert = nullptr;
    sqlite3_prepare_v2(KELODBInternalDBHdlGet(connection_), "INSERT INTO logs(msg) VALUES(?)", -1, &insert,
                       nullptr);
    for (const std::string &text : texts_) {
        sqlite3_bind_text(insert, 1, text.data(), static_cast<int>(text.size()), SQLITE_STATIC);
        sqlite3_step(insert);
        sqlite3_reset(insert);
    }
    sqlite3_finalize(insert);
    Run("COMMIT");
}

SearchTable::~SearchTable() {
    KELODBClose(connection_);
}

std::vector<std::string> SearchTable::Matching(const std::string &keyword) const {
    const std::string sql =
        "SELECT id FROM logs WHERE id > 0 AND (" + GenSQLRegexp(keyword, "msg") + ") ORDER BY id";
    DBResult_tag *result = nullptr;
    if (KELODBExecute(connection_, sql.c_str(), &result) < 0)
        return {Error()};
    std::vector<std::string> found;
    for (unsigned int row = 0; KELODBFetchRow(result, &row) >= 0;)
        found.push_back(texts_[std::stoul(KELODBFetchField(result, row, "id")) - 1]);
    KELODBFreeResult(result);
    return found;
}

bool SearchTable::MatchesNull(const std::string &keyword) const {
    return CountWhere("msg IS NULL AND " + GenSQLRegexp(keyword, "msg")) == 1;
}

int SearchTable::CountWhere(const std::string &condition) const {
    DBResult_tag *result = nullptr;
    if (KELODBExecute(connection_, ("SELECT id FROM logs WHERE " + condition).c_str(), &result) < 0)
        return -1;
    const int count = KELODBNumRows(result);
    KELODBFreeResult(result);
    return count;
}

int SearchTable::Run(const std::string &sql) const {
    return KELODBExecute(connection_, sql.c_str(), nullptr);
}

std::string SearchTable::Error() const {
    return KELODBErrorGet(connection_);
}

} // namespace kelo::test
