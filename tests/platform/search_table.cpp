#include "platform/search_table.h"

#include "keloplatform/gensqlregexp.h"

namespace kelo::test {

SearchTable::SearchTable(const std::vector<std::string> &texts) : texts_(texts) {
    const std::string path = root_.File("logs.db");
    RunSql(path, "CREATE TABLE logs(id INTEGER PRIMARY KEY, msg TEXT); INSERT INTO logs VALUES(0, NULL)");
    connection_ = ConnectTo(path);
    Execute(connection_, "BEGIN");
    sqlite3_stmt *insert = nullptr;
    sqlite3_prepare_v2(KELODBInternalDBHdlGet(connection_.get()), "INSERT INTO logs(msg) VALUES(?)", -1,
                       &insert, nullptr);
    for (const std::string &text : texts_) {
        sqlite3_bind_text(insert, 1, text.data(), static_cast<int>(text.size()), SQLITE_STATIC);
        sqlite3_step(insert);
        sqlite3_reset(insert);
    }
    sqlite3_finalize(insert);
    Execute(connection_, "COMMIT");
}

std::vector<std::string> SearchTable::Matching(const std::string &keyword) const {
    const std::string condition = "id > 0 AND (" + GenSQLRegexp(keyword, "msg") + ")";
    const Outcome outcome =
        Execute(connection_, "SELECT id FROM logs WHERE " + condition + " ORDER BY id", {"id"});
    std::vector<std::string> found;
    for (const auto &row : outcome.rows)
        found.push_back(texts_[std::stoul(*row[0]) - 1]);
    if (outcome.status != 0)
        found.push_back(outcome.error);
    return found;
}

int SearchTable::CountWhere(const std::string &condition) const {
    const Outcome outcome = Execute(connection_, "SELECT id FROM logs WHERE " + condition);
    return outcome.status == 0 ? static_cast<int>(outcome.rows.size()) : -1;
}

} // namespace kelo::test
