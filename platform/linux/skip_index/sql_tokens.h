#pragma once

#include <cstdint>
#include <initializer_list>
#include <optional>
#include <span>
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

// The value of a string token, and of a number without a fraction.
std::string StringValue(const SqlToken &token);
std::optional<int64_t> IntegerValue(const SqlToken &token);

// Neighbouring tokens of a statement.
using SqlTokens = std::span<const SqlToken>;

// Their text in the statement, from the first to the last one.
std::string_view TextOf(SqlTokens tokens);

// Whether they are these: a word or a symbol each, "'" for a string.
bool AreLike(SqlTokens tokens, std::initializer_list<std::string_view> form);

// Whether they have one of the words.
bool HasWord(SqlTokens tokens, std::span<const std::string_view> words);

// Whether the brackets are balanced, and not deeper than what is written by hand or for a keyword. The
// functions below ask for it.
bool HasPlainBrackets(SqlTokens tokens);

// The tokens without brackets around all of them.
SqlTokens Bare(SqlTokens tokens);

// The parts between the `word`s outside of brackets.
std::vector<SqlTokens> Split(SqlTokens tokens, std::string_view word);

} // namespace kelo::platform
