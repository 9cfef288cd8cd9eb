#include "search/term_sql.h"

#include <re2/re2.h>

#include <algorithm>
#include <cstddef>

#include "search/letter_case.h"
#include "search/regexp_function.h"

namespace kelo::platform {
namespace {

// SQLite refuses LIKE and GLOB patterns beyond 50,000 bytes, and matches them with a recursion for every
// star.
constexpr size_t kMaxPatternBytes = 40'000;
constexpr std::ptrdiff_t kMaxStars = 1'000;

using Pieces = std::vector<TermPiece>;

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
    for (const TermPiece &piece : pieces) {
        if (HasCapitals(piece.literal))
            return LetterCase::kExact;
        if (std::any_of(piece.literal.begin(), piece.literal.end(),
                        [](char c) { return c >= 'a' && c <= 'z'; }))
            letterCase = LetterCase::kIgnored;
    }
    return letterCase;
}

// The notation of a pattern language for the pieces of a term.
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
    for (const TermPiece &piece : pieces) {
        if (piece.kind == TermPiece::Kind::kAnyText)
            pattern += syntax.anyText;
        else if (piece.kind == TermPiece::Kind::kAnyCharacter)
            pattern += syntax.anyCharacter;
        for (const char byte : piece.literal) {
            const bool isSpecial = syntax.special.find(byte) != std::string_view::npos;
            pattern.append(isSpecial ? syntax.beforeSpecial : "").append(1, byte);
            pattern.append(isSpecial ? syntax.afterSpecial : "");
        }
    }
    return pattern;
}

// "0" and the reason in `broken` if RE2 refuses the regex.
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
    const LetterCase letterCase = LetterCaseOf(pieces);
    // GLOB is the fastest search if its pattern begins with a character and not with a set.
    const bool globIsFast = kGlob.special.find(pieces[0].literal.substr(0, 1)) == std::string_view::npos;
    const bool ignoreCase =
        letterCase == LetterCase::kIgnored || (letterCase == LetterCase::kNoLetters && !globIsFast);
    const PatternSyntax &syntax = ignoreCase ? kLike : kGlob;
    const bool isLiteral = pieces.size() == 1 && pieces[0].kind == TermPiece::Kind::kLiteral;
    const auto stars = std::count_if(pieces.begin(), pieces.end(), [](const TermPiece &piece) {
        return piece.kind == TermPiece::Kind::kAnyText;
    });
    const std::string pattern = Pattern(pieces, syntax);

    if (isLiteral && pattern.size() > kMaxPatternBytes)
        return LiteralSql(pieces[0].literal, ignoreCase, column);
    if (pattern.size() > kMaxPatternBytes || stars > kMaxStars)
        return RegexSql("(?s)" + Pattern(pieces, kRegex), ignoreCase, column, broken);
    if (ignoreCase) {
        const bool hasEscapes = pattern.find('\\') != std::string::npos;
        return column + " LIKE " + Quoted("%" + pattern + "%") + (hasEscapes ? " ESCAPE '\\'" : "");
    }
    if (isLiteral && !globIsFast)
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
