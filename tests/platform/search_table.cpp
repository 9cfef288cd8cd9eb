#include "platform/search_table.h"

#include "keloplatform/gensqlregexp.h"

namespace kelo::test {

SearchTable::SearchTable(const std::vector<std::string> &texts) : texts_(texts) {
    const std::string path = root_.File("logs.db");
    CreateLogDatabase(path);
    std::vector<_SYSLOG_LOG_DATA_tag> logs(texts_.size());
    for (size_t i = 0; i < logs.size(); ++i)
        logs[i].msg = texts_[i];
    InsertLogs(path, logs);
    RunSql(path, "INSERT INTO logs(id) VALUES(0)");
    connection_ = ConnectTo(path);
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
