#include "search/term_sql.h"

#include <re2/re2.h>

#include <algorithm>
#include <cstddef>

#include "search/letter_case.h"
#include "search/regexp_function.h"

namespace kelo::platform {
namespace {

// SQLite refuses LIKE and GLOB patterns beyond 50,000 bytes, and takes quadratic time for many wildcards.
constexpr size_t kMaxPatternBytes = 40'000;
constexpr size_t kMaxPatternPieces = 32;

using Pieces = std::vector<Piece>;

std::string Quoted(std::string_view text) {
    std::string quoted = "'";
    for (const char byte : text) {
        quoted += byte;
        if (byte == '\'')
            quoted += byte;
    }
    return quoted + "'";
}

enum class LetterCase { kNoLetters, kIgnored, kExact };

LetterCase LetterCaseOf(const Pieces &pieces) {
    LetterCase letterCase = LetterCase::kNoLetters;
    for (const Piece &piece : pieces) {
        if (HasCapitals(piece.literal))
            return LetterCase::kExact;
        if (std::any_of(piece.literal.begin(), piece.literal.end(),
                        [](char c) { return c >= 'a' && c <= 'z'; }))
            letterCase = LetterCase::kIgnored;
    }
    return letterCase;
}

// How a pattern language writes the pieces of a term.
struct PatternSyntax {
    const char *anyText;
    const char *anyCharacter;
    std::string_view special;
    const char *beforeSpecial;
    const char *afterSpecial;
};
constexpr PatternSyntax kGlob = {"*", "?", "*?[", "[", "]"};
constexpr PatternSyntax kLike = {"%", "_", "%_\\", "\\", ""};
constexpr PatternSyntax kRegex = {".*", ".", R"(\^$.|?*+()[]{})", "\\", ""};

std::string Pattern(const Pieces &pieces, const PatternSyntax &syntax) {
    std::string pattern;
    for (const Piece &piece : pieces) {
        if (piece.kind == Piece::Kind::kAnyText)
            pattern += syntax.anyText;
        else if (piece.kind == Piece::Kind::kAnyCharacter)
            pattern += syntax.anyCharacter;
        for (const char byte : piece.literal) {
            const bool isSpecial = syntax.special.find(byte) != std::string_view::npos;
            pattern.append(isSpecial ? syntax.beforeSpecial : "").append(1, byte);
            pattern.append(isSpecial ? syntax.afterSpecial : "");
        }
    }
    return pattern;
}

// "0" and the reason in `broken` where RE2 refuses the regex.
std::string RegexSql(const std::string &regex, bool ignoreCase, const std::string &column,
                     std::vector<BrokenRegex> &broken) {
    const auto compiled = CompileRegex(regex, ignoreCase);
    if (!compiled->ok()) {
        broken.push_back({regex, compiled->error()});
        return "0";
    }
    return (ignoreCase ? "regexpi(" : "regexp(") + Quoted(regex) + ", " + column + ")";
}

std::string LiteralSql(const std::string &literal, bool ignoreCase, const std::string &column) {
    return "instr(" + (ignoreCase ? "lower(" + column + ")" : column) + ", " + Quoted(literal) + ") > 0";
}

std::string TextSql(const Pieces &pieces, const std::string &column, std::vector<BrokenRegex> &broken) {
    const bool ignoreCase = LetterCaseOf(pieces) == LetterCase::kIgnored;
    const PatternSyntax &syntax = ignoreCase ? kLike : kGlob;
    const bool isLiteral = pieces.size() == 1 && pieces[0].kind == Piece::Kind::kLiteral;
    const std::string pattern = Pattern(pieces, syntax);

    if (isLiteral && pattern.size() > kMaxPatternBytes)
        return LiteralSql(pieces[0].literal, ignoreCase, column);
    if (pattern.size() > kMaxPatternBytes || pieces.size() > kMaxPatternPieces)
        return RegexSql("(?s)" + Pattern(pieces, kRegex), ignoreCase, column, broken);
    if (ignoreCase) {
        const bool hasEscapes = pattern.find('\\') != std::string::npos;
        return column + " LIKE " + Quoted("%" + pattern + "%") + (hasEscapes ? " ESCAPE '\\'" : "");
    }
    // GLOB finds a literal by its first character, unless that is a set: then it is seven times slower.
    if (isLiteral && pattern[0] == '[')
        return LiteralSql(pieces[0].literal, false, column);
    return column + " GLOB " + Quoted("*" + pattern + "*");
}

} // namespace

std::string TermSql(const Term &term, const std::string &column, std::vector<BrokenRegex> &broken) {
    std::string condition;
    if (term.MatchesEveryText())
        condition = MatchAllSql(column);
    else if (term.IsRegex())
        condition = RegexSql(term.regex, !RegexHasCapitals(term.regex), column, broken);
    else
        condition = TextSql(term.pieces, column, broken);
    const bool isBroken = condition == "0";
    return term.excluded && !isBroken ? "ifnull(NOT " + condition + ", 1)" : condition;
}

std::string MatchAllSql(const std::string &column) {
    return column + " GLOB '**'";
}

} // namespace kelo::platform
