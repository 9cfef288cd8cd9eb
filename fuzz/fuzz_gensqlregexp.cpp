// Any keyword gives SQL that SQLite prepares and runs, and that means the same in every position.

#include <unistd.h>

#include <cstddef>
#include <cstdint>

#include "keloplatform/gensqlregexp.h"
#include "keloplatform/kelodb.h"
#include "quiet.h"

namespace {

// A connection to a few rows in a file that has no name any more.
DBConnect_tag *Rows() {
    const char *folder = std::getenv("TMPDIR");
    std::string path = std::string(folder != nullptr && folder[0] == '/' ? folder : "/tmp") + "/fuzz-XXXXXX";
    const int file = mkstemp(path.data());
    DBConnect_tag *rows = file >= 0 ? KELODBConnect(nullptr, nullptr, nullptr, path.c_str()) : nullptr;
    close(file);
    for (const char *sql : {"CREATE TABLE logs(msg TEXT)",
                            "INSERT INTO logs VALUES (NULL), (''), ('disk full'), ('Wörter 100%_[x]'), "
                            "(CAST(x'61ff62e9' AS TEXT)), ('it''s /a\\b\"c*?')"}) {
        if (KELODBExecute(rows, sql, nullptr) != 0)
            Fail("no table", path);
    }
    unlink(path.c_str());
    return rows;
}

int CountWhere(const std::string &condition) {
    static DBConnect_tag *const rows = Rows();
    const std::string sql = "SELECT 1 FROM logs WHERE " + condition;
    DBResult_tag *result = nullptr;
    if (KELODBExecute(rows, sql.c_str(), &result) != 0)
        Fail(KELODBErrorGet(rows), sql);
    const int count = KELODBNumRows(result);
    KELODBFreeResult(result);
    return count;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    const std::string keyword(reinterpret_cast<const char *>(data), size);
    const std::string sql = GenSQLRegexp(keyword, "msg");
    const int found = CountWhere("(" + sql + ")");
    if (CountWhere("1 AND " + sql + " AND 1") != found || CountWhere("0 OR " + sql) != found)
        Fail("no operand", sql);
    if (GenSQLRegexp(" " + keyword, "msg") != sql)
        Fail("a leading blank changes it", sql);
    return 0;
}
