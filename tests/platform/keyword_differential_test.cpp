#include "keloplatform/gensqlregexp.h"
#include "platform/search_table.h"

// Generated keywords and texts, compared with a matcher that knows nothing of SQL: it works on the terms that
// the keyword was written from, character by character.

namespace kelo::test {
namespace {

constexpr char kAnyText = '\1';
constexpr char kAnyCharacter = '\2';

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

bool Finds(const std::string &pattern, std::string_view text) {
    const bool fold = std::ranges::none_of(pattern, [](char c) { return Folded(c) != c; });
    size_t from = 0;
    while (from <= text.size() && !MatchesHere(pattern, text.substr(from), fold))
        ++from;
    return from <= text.size();
}

std::string Written(const std::string &pattern) {
    std::string text;
    for (const char character : pattern) {
        if (std::string_view("*?\"\\-/").find(character) != std::string_view::npos)
            text += '\\';
        text += character == kAnyText ? '*' : character == kAnyCharacter ? '?' : character;
    }
    return text;
}

TEST(Keyword, FindsWhatANaiveMatcherFinds) {
    std::mt19937 random{20200102}; // always the same, so that a failure comes again
    const auto some = [&](size_t atLeast, size_t atMost, std::string_view from) {
        std::string some(atLeast + random() % (atMost - atLeast + 1), ' ');
        std::ranges::generate(some, [&] { return from[random() % from.size()]; });
        return some;
    };
    std::vector<std::string> texts(200);
    for (std::string &text : texts)
        text = some(0, 8, "aabbAB%_[]^'\"\\-/*? ");
    const SearchTable table(texts);
    for (int round = 0; round < 2000; ++round) {
        std::vector<std::string> expected = texts;
        std::string keyword;
        for (size_t terms = 1 + round % 2; terms > 0; --terms) {
            const std::string term = some(1, 3, "aabbAB%_[]^'\"\\-/*?\1\1\2");
            const bool isExcluded = random() % 4 == 0;
            keyword += (isExcluded ? " -" : " ") + Written(term);
            std::erase_if(expected, [&](const std::string &text) { return Finds(term, text) == isExcluded; });
        }
        ASSERT_EQ(table.Matching(keyword), expected) << keyword << "\n" << GenSQLRegexp(keyword, "msg");
    }
}

} // namespace
} // namespace kelo::test
