#include "skip_index/regex_literals.h"

#include <re2/filtered_re2.h>
#include <re2/re2.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>

#include "search/regexp_function.h"
#include "skip_index/grams.h"

namespace kelo::platform {
namespace {

// More are not worth their time: all sets of literals are tried.
constexpr size_t kMostLiterals = 6;
constexpr size_t kMaxRegexBytes = 1'000;

// Whether a text with these of the literals may match.
bool MayMatch(const re2::FilteredRE2 &filter, uint32_t literals) {
    std::vector<int> present;
    for (int literal = 0; literal < static_cast<int>(kMostLiterals); ++literal) {
        if ((literals >> literal & 1) != 0)
            present.push_back(literal);
    }
    std::vector<int> regexes;
    filter.AllPotentials(present, &regexes);
    return !regexes.empty();
}

} // namespace

std::vector<std::vector<std::string>> LiteralsOfRegex(const std::string &regex, bool ignoreCase) {
    if (regex.size() > kMaxRegexBytes)
        return {};
    re2::FilteredRE2 filter(kGramBytes);
    int id = 0;
    if (filter.Add(regex, RegexOptions(ignoreCase), &id) != RE2::NoError)
        return {};
    std::vector<std::string> literals;
    filter.Compile(&literals);
    if (literals.empty() || literals.size() > kMostLiterals || MayMatch(filter, 0))
        return {};
    // What suffices with some literals suffices with more: only the smallest sets count.
    std::vector<uint32_t> smallest;
    for (uint32_t set = 1; set < 1U << literals.size(); ++set) {
        const auto isPart = [set](uint32_t smaller) { return (smaller & set) == smaller; };
        if (std::none_of(smallest.begin(), smallest.end(), isPart) && MayMatch(filter, set))
            smallest.push_back(set);
    }
    std::vector<std::vector<std::string>> lists;
    for (const uint32_t set : smallest) {
        std::vector<std::string> &list = lists.emplace_back();
        for (size_t literal = 0; literal < literals.size(); ++literal) {
            if ((set >> literal & 1) != 0)
                list.push_back(literals[literal]);
        }
    }
    return lists;
}

} // namespace kelo::platform
