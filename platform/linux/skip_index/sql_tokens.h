#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace kelo::platform {

// A token of an SQL statement, a view into its text.
struct SqlToken {
    enum class Kind { kWord, kString, kNumber, kSymbol };
    Kind kind;
    std::string_view text; // as written: a string with its quotes

    bool Is(char symbol) const { return kind == Kind::kSymbol && text.size() == 1 && text[0] == symbol; }
    // Whether it is this word, which is in lower case, whatever its letter case.
    bool Is(std::string_view word) const;
};

// The tokens of a statement in the small part of SQL that searches use. Nothing for a text with anything
// else: comments, parameters, quoted names, several statements, an open string.
std::optional<std::vector<SqlToken>> ReadSqlTokens(std::string_view sql);

// The text of a string token.
std::string StringValue(const SqlToken &token);

} // namespace kelo::platform
