#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace kelo::platform {

// A part of a text term: literal text, or one of the wildcards.
struct TermPiece {
    enum class Kind { kLiteral, kAnyText, kAnyCharacter };
    Kind kind = Kind::kLiteral;
    std::string literal; // empty unless kLiteral
};

// One term of a keyword.
struct Term {
    bool excluded = false;
    std::string regex; // of a /regex/, not empty; then there are no pieces
    // Of a text term, to find anywhere in a text. There is no kAnyText at either end or next to another one;
    // no pieces at all match every text.
    std::vector<TermPiece> pieces;

    bool IsRegex() const { return !regex.empty(); }
    bool MatchesEveryText() const { return !IsRegex() && pieces.empty(); }
};

// Terms joined by OR; at least one.
using Alternatives = std::vector<Term>;

// Reads a keyword (see gensqlregexp.h for the language). Any text is a keyword; a blank one has no terms. A
// row must match every group of alternatives. `keyword` is UTF-8 without NUL bytes.
std::vector<Alternatives> ParseKeyword(std::string_view keyword);

} // namespace kelo::platform
