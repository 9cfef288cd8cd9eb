#pragma once

#include <string>

#include "cluster/row_ids.h"
#include "cluster/statement_tokens.h"

namespace kelo::platform {

// A condition over table "logs" in the engine's language.
struct Condition {
    std::string text;
    RowIds ids; // outside of which no row meets it
};

// Reads the condition at the position of the tokens, as far as it goes. Throws ClusterError for anything that
// has no equivalent.
Condition ReadCondition(StatementTokens &tokens);

// Whether table "logs" has the column; whether it holds a number.
bool IsLogColumn(std::string_view word);
bool IsNumberColumn(std::string_view word);

// A number with its sign, at the position. Throws ClusterError.
std::string ReadNumber(StatementTokens &tokens);

} // namespace kelo::platform
