#pragma once

#include <sqlite3.h>

#include <memory>
#include <string_view>

namespace kelo::platform {

struct FinalizeStatement {
    void operator()(sqlite3_stmt *statement) const { sqlite3_finalize(statement); }
};
using Statement = std::unique_ptr<sqlite3_stmt, FinalizeStatement>;

// The one statement of an SQL text.
struct SingleStatement {
    Statement prepared; // null if the text has no statement
    // The statement in the text, without a closing semicolon. It may end inside a comment: text appended to
    // it must start with kCommentEnd.
    std::string_view text;
};

// Ends a comment of either kind and is blank without one.
inline constexpr char kCommentEnd[] = "\n/**/";

// Prepares the one statement of `sql`. Returns false with the connection's error set when it does not
// compile, or when a second one follows.
bool PrepareSingle(sqlite3 *db, const char *sql, SingleStatement &single);

} // namespace kelo::platform
