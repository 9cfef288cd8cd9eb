#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

#include "skip_index/sql_tokens.h"

namespace kelo::platform {

// A word with its ASCII letters in lower case.
std::string LowerCase(std::string_view word);

// The tokens of a statement with a position. Throws ClusterError for a text that cannot be taken apart.
class StatementTokens {
public:
    explicit StatementTokens(std::string_view sql);

    bool AtEnd() const { return at_ == tokens_.size(); }
    size_t Position() const { return at_; }
    void MoveTo(size_t position) { at_ = position; }

    // Whether the token at the position, or `further` after it, is this; words are in lower case.
    bool Is(char symbol, size_t further = 0) const;
    bool Is(std::string_view word, size_t further = 0) const;
    bool IsKind(SqlToken::Kind kind, size_t further = 0) const;

    // Passes a token if it is this, and returns whether it was.
    bool Pass(char symbol);
    bool Pass(std::string_view word);

    // The token at the position, which is passed. Throws at the end.
    const SqlToken &Take();

    // Throws ClusterError that the statement is none of those a cluster knows, with the text at the position.
    [[noreturn]] void RefuseRest(const std::string &reason) const;

private:
    std::string text_; // without comments
    std::vector<SqlToken> tokens_;
    size_t at_ = 0;
};

} // namespace kelo::platform
