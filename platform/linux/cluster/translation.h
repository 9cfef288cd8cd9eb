#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "cluster/configuration.h"
#include "cluster/row_ids.h"

namespace kelo::platform {

// A statement for SQLite as it is answered by a cluster.
struct Translation {
    enum class Kind {
        kAnswer,   // `sql` gives the rows
        kRows,     // the rows of `where`, in the order of `orderColumn`
        kPageById, // the rows after the `offset` newest, `limit` at most, and the number of all
        kDelete,   // the rows of `where` go
    };
    Kind kind = Kind::kAnswer;
    std::vector<std::string> columns; // of the result
    std::string sql = {};
    std::string where = {}; // a condition; "1" for all rows
    RowIds ids = {};        // that the condition leaves
    std::string orderColumn = {};
    bool isAscending = true;
    uint64_t limit = 0;
    uint64_t offset = 0;
    bool isCount32 = false; // the caller takes the one number for one of 32 bits
};

// The columns of table "logs", in its order.
const std::vector<std::string> &LogColumns();

// Translates one of the statements that are sent to a log database. Throws ClusterError for every other one;
// the text says what is unknown in it.
Translation Translate(std::string_view sql, const std::string &database);

} // namespace kelo::platform
