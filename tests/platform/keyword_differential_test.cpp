#include <algorithm>
#include <random>

#include "keloplatform/gensqlregexp.h"
#include "platform/search_table.h"

// Generated keywords and texts, compared with a matcher that knows nothing of SQL: it works on the terms that
// the keyword was written from, character by character.

namespace kelo::test {
namespace {

constexpr char kAnyText = '\1';
constexpr char kAnyCharacter = '\2';

struct Term {
    bool isPhrase;
    bool isExcluded;
    std::string characters;
};

char Folded(char character) {
    return character >= 'A' && character <= 'Z' ? static_cast<char>(character + ('a' - 'A')) : character;
}

bool MatchesHere(std::string_view pattern, std::string_view text, bool fold) {
    if (pattern.empty())
        return true;
    if (pattern[0] == kAnyText)
        return MatchesHere(pattern.substr(1), text, fold) ||
               (!text.empty() && MatchesHere(pattern, text.substr(1), fold));
    const bool same = !text.empty() && (pattern[0] == kAnyCharacter || pattern[0] == text[0] ||
                                        (fold && Folded(pattern[0]) == Folded(text[0])));
    return same && MatchesHere(pattern.substr(1), text.substr(1), fold);
}

bool Matches(const Term &term, std::string_view text) {
    const bool fold = std::ranges::none_of(term.characters, [](char c) { return Folded(c) != c; });
    for (size_t from = 0; from <= text.size(); ++from) {
        if (MatchesHere(term.characters, text.substr(from), fold))
            return !term.isExcluded;
    }
    return term.isExcluded;
}

std::string Written(const Term &term) {
    const std::string special = term.isPhrase ? "\"\\" : "*?\"\\-/";
    std::string text;
    for (const char character : term.characters) {
        if (special.find(character) != std::string::npos)
            text += '\\';
        text += character == kAnyText ? '*' : character == kAnyCharacter ? '?' : character;
    }
    return (term.isExcluded ? "-" : "") + (term.isPhrase ? '"' + text + '"' : text);
}

class Dice {
public:
    bool OneIn(unsigned int n) { return random_() % n == 0; }
    std::string Some(size_t atLeast, size_t atMost, std::string_view from) {
        std::string some(atLeast + random_() % (atMost - atLeast + 1), ' ');
        std::ranges::generate(some, [&] { return from[random_() % from.size()]; });
        return some;
    }
    Term AnyTerm() {
        const bool isPhrase = OneIn(3);
        return {isPhrase, OneIn(4), Some(1, 3, isPhrase ? kText : kWord)};
    }

    static constexpr std::string_view kWord = "aabbAB%_[]^'\"\\-/*?\1\1\2";
    static constexpr std::string_view kText = "aabbAB%_[]^'\"\\-/*? ";

private:
    std::mt19937 random_{20200102}; // always the same, so that a failure comes again
};

TEST(Keyword, FindsWhatANaiveMatcherFinds) {
    Dice dice;
    std::vector<std::string> texts(200);
    for (std::string &text : texts)
        text = dice.Some(0, 8, Dice::kText);
    const SearchTable table(texts);
    for (int round = 0; round < 2000; ++round) {
        std::string keyword;
        std::vector<std::string> expected = texts;
        do {
            std::vector<Term> group = {dice.AnyTerm()};
            keyword += " " + Written(group[0]);
            while (dice.OneIn(3)) {
                group.push_back(dice.AnyTerm());
                keyword += " OR " + Written(group.back());
            }
            std::erase_if(expected, [&](const std::string &text) {
                return std::ranges::none_of(group, [&](const Term &term) { return Matches(term, text); });
            });
        } while (dice.OneIn(2));
        ASSERT_EQ(table.Matching(keyword), expected) << keyword << "\n" << GenSQLRegexp(keyword, "msg");
    }
}

} // namespace
} // namespace kelo::test
