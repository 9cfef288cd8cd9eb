#include "skip_index/sql_tokens.h"

#include <algorithm>
#include <cstddef>

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

} // namespace kelo::platform
