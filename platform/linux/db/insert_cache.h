#pragma once

#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "db/statement.h"

namespace kelo::platform {

// Runs INSERT statements that differ only in their literals through one prepared statement, with the literals
// bound: compiling such a statement costs several times as much as running it.
//
// This applies to texts of the form INSERT [OR word] INTO table [(columns)] VALUES (literals) [;] with texts,
// whole numbers and NULL. Their effect is the same either way.
class InsertCache {
public:
    // Runs `sql` if it has the form of the text before it. Returns whether that succeeded (otherwise the
    // connection's error is set), or nothing when the statement has to be run in the ordinary way.
    std::optional<bool> Run(sqlite3 *db, const char *sql);

    // Ends the prepared statement: before the connection is closed.
    void Clear() { prepared_.reset(); }

private:
    using Literal = std::variant<sqlite3_int64, std::string>;

    bool Read(const char *sql);
    bool ReadHead(const char *&text);
    bool ReadLiteral(const char *&text);
    void ReadText(const char *&text);
    bool ReadNumber(const char *&text);
    Literal &NextLiteral();
    bool RunPrepared();

    std::string knownForm_; // with a '?' for each literal
    Statement prepared_;    // of the known form, from its second text on

    // Of the current text. They keep their memory from one text to the next.
    std::string form_;
    std::vector<Literal> literals_;
    size_t literalCount_ = 0;
};

} // namespace kelo::platform
