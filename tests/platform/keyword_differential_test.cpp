#include <gtest/gtest.h>
#include <regex.h>

#include <algorithm>
#include <random>
#include <stdexcept>
#include <string>
#include <vector>

#include "keloplatform/gensqlregexp.h"
#include "platform/search_table.h"

// Generated keywords and texts, compared with a matcher that knows nothing of SQL: it works on the terms that
// the keyword was written from, character by character.

namespace kelo::test {
namespace {

// Code points, so that a wildcard and an accented letter are one element each. The wildcards have values
// that no text has.
using Characters = std::u32string;
constexpr char32_t kAnyText = 1;
constexpr char32_t kAnyCharacter = 2;
constexpr char32_t kEAcute = 0xE9;

enum class Form { kWord, kPhrase, kRegex };
struct Term {
    Form form;
    bool excluded;
    Characters characters; // of a regex: what POSIX and RE2 read in the same way
};

std::string Utf8(const Characters &characters) {
    std::string text;
    for (const char32_t character : characters)
        text += character == kEAcute ? "é" : std::string(1, static_cast<char>(character));
    return text;
}

char32_t Folded(char32_t character) {
    return character >= 'A' && character <= 'Z' ? character + ('a' - 'A') : character;
}

bool MatchesHere(const Characters &pattern, size_t at, const Characters &text, size_t from, bool fold) {
    if (at == pattern.size())
        return true;
    if (pattern[at] == kAnyText)
        return MatchesHere(pattern, at + 1, text, from, fold) ||
               (from < text.size() && MatchesHere(pattern, at, text, from + 1, fold));
    if (from == text.size())
        return false;
    const bool same = pattern[at] == kAnyCharacter || pattern[at] == text[from] ||
                      (fold && Folded(pattern[at]) == Folded(text[from]));
    return same && MatchesHere(pattern, at + 1, text, from + 1, fold);
}

bool Matches(const Term &term, const Characters &text) {
    const bool fold = std::none_of(term.characters.begin(), term.characters.end(),
                                   [](char32_t character) { return Folded(character) != character; });
    bool found = false;
    if (term.form == Form::kRegex) {
        regex_t regex;
        if (regcomp(&regex, Utf8(term.characters).c_str(),
                    REG_EXTENDED | REG_NOSUB | (fold ? REG_ICASE : 0)) != 0)
            throw std::invalid_argument(Utf8(term.characters));
        found = regexec(&regex, Utf8(text).c_str(), 0, nullptr, 0) == 0;
        regfree(&regex);
    }
    for (size_t from = 0; term.form != Form::kRegex && from <= text.size() && !found; ++from)
        found = MatchesHere(term.characters, 0, text, from, fold);
    return found != term.excluded;
}

std::string Written(const Term &term) {
    const std::string special = term.form == Form::kWord ? "*?\"\\-/" : "\"\\";
    std::string text = term.excluded ? "-" : "";
    text += term.form == Form::kPhrase ? "\"" : term.form == Form::kRegex ? "/" : "";
    for (const char32_t character : term.characters) {
        const bool escaped = term.form != Form::kRegex && character < 0x80 &&
                             special.find(static_cast<char>(character)) != std::string::npos;
        const bool isWildcard = character == kAnyText || character == kAnyCharacter;
        text += isWildcard ? (character == kAnyText ? "*" : "?") : (escaped ? "\\" : "") + Utf8({character});
    }
    return text + (term.form == Form::kPhrase ? "\"" : term.form == Form::kRegex ? "/" : "");
}

class Dice {
public:
    bool OneIn(unsigned int n) { return random_() % n == 0; }
    char32_t Pick(const Characters &from) { return from[random_() % from.size()]; }
    Characters Some(size_t atLeast, size_t atMost, const Characters &from) {
        Characters some(atLeast + random_() % (atMost - atLeast + 1), U' ');
        std::generate(some.begin(), some.end(), [&] { return Pick(from); });
        return some;
    }
    Term AnyTerm() {
        const bool excluded = OneIn(4);
        if (OneIn(5)) {
            const Characters regexes[] = {U"a+b", U"[aB]%", U"^a", U"'|_$", U"a[aA]?b", U"(aB)+", U"\\\\"};
            return {Form::kRegex, excluded, regexes[random_() % std::size(regexes)]};
        }
        if (OneIn(3))
            return {Form::kPhrase, excluded, Some(1, 3, kTextCharacters)};
        return {Form::kWord, excluded, Some(1, 3, kWordCharacters)};
    }

    inline static const Characters kWordCharacters =
        Characters(U"aabbAB%_[]^'\"\\-/*?") + kEAcute + kAnyText + kAnyText + kAnyCharacter;
    inline static const Characters kTextCharacters = Characters(U"aabbAB%_[]^'\"\\-/*? ") + kEAcute;

private:
    std::mt19937 random_{20200102}; // always the same, so that a failure comes again
};

TEST(Keyword, FindsWhatANaiveMatcherFinds) {
    Dice dice;
    std::vector<Characters> characters;
    std::vector<std::string> texts;
    for (int i = 0; i < 200; ++i) {
        characters.push_back(dice.Some(0, 8, Dice::kTextCharacters));
        texts.push_back(Utf8(characters.back()));
    }
    const SearchTable table(texts);
    for (int round = 0; round < 2000; ++round) {
        std::string keyword;
        std::vector<bool> expected(texts.size(), true);
        for (bool more = true; more; more = dice.OneIn(2)) {
            std::vector<bool> group(texts.size(), false);
            std::string separator = " ";
            for (bool alternative = true; alternative; alternative = dice.OneIn(3)) {
                const Term term = dice.AnyTerm();
                keyword += separator + Written(term);
                separator = " OR ";
                for (size_t i = 0; i < texts.size(); ++i)
                    group[i] = group[i] || Matches(term, characters[i]);
            }
            std::transform(expected.begin(), expected.end(), group.begin(), expected.begin(),
                           std::logical_and());
        }
        std::vector<std::string> matching;
        for (size_t i = 0; i < texts.size(); ++i) {
            if (expected[i])
                matching.push_back(texts[i]);
        }
        ASSERT_EQ(table.Matching(keyword), matching) << keyword << "\n" << GenSQLRegexp(keyword, "msg");
    }
}

} // namespace
} // namespace kelo::test
