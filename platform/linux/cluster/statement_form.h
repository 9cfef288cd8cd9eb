#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "cluster/condition.h"
#include "cluster/statement_tokens.h"

namespace kelo::platform {

// What stands in the places of a form that are not fixed.
struct FormValues {
    std::vector<std::string> values; // of $number, $text, $name and $column, in their order
    std::optional<Condition> where;  // of $where
    std::string orderColumn;         // of $order; "" for none
    bool isAscending = true;
};

// Compares a statement with a form: its tokens with blanks between them, words in lower case, and
//
//     $number   a whole number with its sign            $column   a column of table "logs"
//     $text     a text in quotation marks                $name     any other name
//     $where    nothing, or WHERE and a condition        $order    nothing, or ORDER BY a column asc or desc
//
// False when the statement is another one; its tokens are at the first that does not fit then. Throws
// ClusterError for a condition that has no equivalent, if the statement has the form up to it.
bool HasForm(StatementTokens &tokens, std::string_view form, FormValues &values);

} // namespace kelo::platform
