#include "skip_index/sql_tokens.h"

#include <algorithm>
#include <charconv>
#include <cstddef>
#include <system_error>

namespace kelo::platform {
namespace {

using Kind = SqlToken::Kind;

bool IsBlank(char byte) {
    return byte == ' ' || byte == '\t' || byte == '\n' || byte == '\r';
}
bool IsDigit(char byte) {
    return byte >= '0' && byte <= '9';
}
char Lower(char byte) {
    return byte >= 'A' && byte <= 'Z' ? static_cast<char>(byte + ('a' - 'A')) : byte;
}
bool IsWordByte(char byte) {
    return (Lower(byte) >= 'a' && Lower(byte) <= 'z') || IsDigit(byte) || byte == '_';
}

// Length of the string at the start of `rest`, 0 if it does not end.
size_t StringLength(std::string_view rest) {
    for (size_t at = 1; at < rest.size(); ++at) {
        if (rest[at] != '\'')
            continue;
        if (at + 1 == rest.size() || rest[at + 1] != '\'')
            return at + 1;
        ++at;
    }
    return 0;
}

// Length of the symbol at the start of `rest`, 0 for what searches do not use.
size_t SymbolLength(std::string_view rest) {
    constexpr std::string_view kSymbols = "()*,.=<>!+-/%|";
    const std::string_view two = rest.substr(0, 2);
    if (kSymbols.find(rest[0]) == std::string_view::npos || two == "--" || two == "/*")
        return 0;
    return two == "<=" || two == ">=" ? 2 : 1;
}

SqlToken TakeToken(std::string_view rest) {
    if (rest[0] == '\'')
        return {Kind::kString, rest.substr(0, StringLength(rest))};
    if (!IsWordByte(rest[0]))
        return {Kind::kSymbol, rest.substr(0, SymbolLength(rest))};
    const auto *end = std::find_if_not(rest.begin(), rest.end(), IsWordByte);
    const std::string_view word = rest.substr(0, static_cast<size_t>(end - rest.begin()));
    return {IsDigit(rest[0]) ? Kind::kNumber : Kind::kWord, word};
}

constexpr int kMaxDepth = 50; // of brackets

// Where the bracket that opens at `open` closes; tokens.size() if it does not.
size_t ClosingBracket(SqlTokens tokens, size_t open) {
    size_t depth = 0;
    for (size_t at = open; at < tokens.size(); ++at) {
        depth += tokens[at].Is('(') ? 1 : 0;
        if (tokens[at].Is(')') && --depth == 0)
            return at;
    }
    return tokens.size();
}

} // namespace

bool SqlToken::Is(std::string_view word) const {
    return kind == Kind::kWord && std::equal(text.begin(), text.end(), word.begin(), word.end(),
                                             [](char written, char byte) { return Lower(written) == byte; });
}

std::optional<std::vector<SqlToken>> ReadSqlTokens(std::string_view sql) {
    std::vector<SqlToken> tokens;
    while (!sql.empty()) {
        if (IsBlank(sql[0])) {
            sql.remove_prefix(1);
            continue;
        }
        tokens.push_back(TakeToken(sql));
        if (tokens.back().text.empty())
            return std::nullopt;
        sql.remove_prefix(tokens.back().text.size());
    }
    return tokens;
}

std::string StringValue(const SqlToken &token) {
    std::string value;
    for (size_t at = 1; at + 1 < token.text.size(); ++at) {
        value += token.text[at];
        if (token.text[at] == '\'')
            ++at;
    }
    return value;
}

std::optional<int64_t> IntegerValue(const SqlToken &token) {
    int64_t number = 0;
    const char *end = token.text.data() + token.text.size();
    const auto [stop, error] = std::from_chars(token.text.data(), end, number);
    return token.kind == SqlToken::Kind::kNumber && error == std::errc() && stop == end
               ? std::optional(number)
               : std::nullopt;
}

std::string_view TextOf(SqlTokens tokens) {
    const char *begin = tokens.front().text.data();
    const char *end = tokens.back().text.data() + tokens.back().text.size();
    return {begin, static_cast<size_t>(end - begin)};
}

bool AreLike(SqlTokens tokens, std::initializer_list<std::string_view> form) {
    return std::equal(tokens.begin(), tokens.end(), form.begin(), form.end(),
                      [](const SqlToken &token, std::string_view expected) {
                          if (token.kind == SqlToken::Kind::kString)
                              return expected == "'";
                          return token.kind == SqlToken::Kind::kWord ? token.Is(expected)
                                                                     : token.text == expected;
                      });
}

bool HasWord(SqlTokens tokens, std::span<const std::string_view> words) {
    return std::any_of(tokens.begin(), tokens.end(), [&](const SqlToken &token) {
        return std::any_of(words.begin(), words.end(), [&](std::string_view word) { return token.Is(word); });
    });
}

bool HasPlainBrackets(SqlTokens tokens) {
    int depth = 0;
    for (const SqlToken &token : tokens) {
        depth += token.Is('(') ? 1 : token.Is(')') ? -1 : 0;
        if (depth < 0 || depth > kMaxDepth)
            return false;
    }
    return depth == 0;
}

SqlTokens Bare(SqlTokens tokens) {
    while (tokens.size() > 2 && tokens[0].Is('(') && ClosingBracket(tokens, 0) == tokens.size() - 1)
        tokens = tokens.subspan(1, tokens.size() - 2);
    return tokens;
}

std::vector<SqlTokens> Split(SqlTokens tokens, std::string_view word) {
    std::vector<SqlTokens> parts;
    size_t begin = 0;
    for (size_t at = 0; at < tokens.size(); ++at) {
        if (tokens[at].Is('('))
            at = ClosingBracket(tokens, at);
        else if (tokens[at].Is(word)) {
            parts.push_back(tokens.subspan(begin, at - begin));
            begin = at + 1;
        }
    }
    parts.push_back(tokens.subspan(begin));
    return parts;
}

} // namespace kelo::platform
