#include "platform/search_table.h"

#include <iomanip>
#include <sstream>

#include "keloplatform/gensqlregexp.h"

namespace kelo::test {

SearchTable::SearchTable(const std::vector<std::string> &texts) : texts_(texts) {
    const std::string path = root_.File("logs.db");
    RunSql(path, "CREATE TABLE logs(id INTEGER PRIMARY KEY, msg TEXT)");
    // In hexadecimal, so that nothing needs to be quoted.
    std::ostringstream rows;
    for (const std::string &text : texts_) {
        rows << ",(NULL, CAST(x'" << std::hex << std::setfill('0');
        for (const unsigned char byte : text)
            rows << std::setw(2) << int{byte};
        rows << "' AS TEXT))";
    }
    RunSql(path, "INSERT INTO logs VALUES(0, NULL)" + rows.str());
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
