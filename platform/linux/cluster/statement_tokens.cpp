#include "cluster/statement_tokens.h"

#include <algorithm>

#include "cluster/cluster_error.h"

namespace kelo::platform {
namespace {

constexpr size_t kShownBytes = 60;

// Length of the string, comment or other byte at the start of `rest`.
size_t LengthOfPiece(std::string_view rest) {
    const auto upTo = [&](size_t end, size_t length) {
        return end == std::string_view::npos ? rest.size() : end + length;
    };
    if (rest[0] == '\'')
        return upTo(rest.find('\'', 1), 1); // a doubled quotation mark makes two strings, which does no harm
    if (rest.starts_with("/*"))
        return upTo(rest.find("*/", 2), 2);
    if (rest.starts_with("--"))
        return upTo(rest.find('\n'), 1);
    return 1;
}

// Comments, such as hints for SQLite, become blanks.
std::string WithoutComments(std::string_view sql) {
    std::string text;
    while (!sql.empty()) {
        const size_t length = LengthOfPiece(sql);
        const bool isComment = sql.starts_with("/*") || sql.starts_with("--");
        text.append(isComment ? " " : sql.substr(0, length));
        sql.remove_prefix(length);
    }
    while (text.ends_with(';') || text.ends_with(' ') || text.ends_with('\n'))
        text.pop_back();
    return text;
}

} // namespace

std::string LowerCase(std::string_view word) {
    std::string lower(word);
    for (char &byte : lower)
        byte = byte >= 'A' && byte <= 'Z' ? static_cast<char>(byte | 0x20) : byte;
    return lower;
}

StatementTokens::StatementTokens(std::string_view sql) : text_(WithoutComments(sql)) {
    std::optional<std::vector<SqlToken>> tokens = ReadSqlTokens(text_);
    if (!tokens)
        throw ClusterError(KELO_FAILURE_STATEMENT,
                           "a cluster cannot run this statement: it has an open string, a quoted name, a "
                           "parameter, a second statement or another character that no search has");
    tokens_ = std::move(*tokens);
}

bool StatementTokens::Is(char symbol, size_t further) const {
    return at_ + further < tokens_.size() && tokens_[at_ + further].Is(symbol);
}

bool StatementTokens::Is(std::string_view word, size_t further) const {
    if (at_ + further >= tokens_.size())
        return false;
    const SqlToken &token = tokens_[at_ + further];
    return token.kind == SqlToken::Kind::kWord ? token.Is(word) : token.text == word;
}

bool StatementTokens::IsKind(SqlToken::Kind kind, size_t further) const {
    return at_ + further < tokens_.size() && tokens_[at_ + further].kind == kind;
}

bool StatementTokens::Pass(char symbol) {
    const bool is = Is(symbol);
    at_ += is ? 1 : 0;
    return is;
}

bool StatementTokens::Pass(std::string_view word) {
    const bool is = Is(word);
    at_ += is ? 1 : 0;
    return is;
}

const SqlToken &StatementTokens::Take() {
    if (AtEnd())
        RefuseRest("its end");
    return tokens_[at_++];
}

void StatementTokens::RefuseRest(const std::string &reason) const {
    std::string shown = "its end";
    if (!AtEnd()) {
        const size_t start = static_cast<size_t>(tokens_[at_].text.data() - text_.data());
        shown =
            "'" + text_.substr(start, kShownBytes) + (start + kShownBytes < text_.size() ? "..." : "") + "'";
    }
    throw ClusterError(KELO_FAILURE_STATEMENT,
                       "a cluster cannot run this statement: " + reason + " at " + shown);
}

} // namespace kelo::platform
