#include "skip_index/search_text.h"

#include <algorithm>
#include <charconv>
#include <functional>
#include <numeric>
#include <span>
#include <utility>

#include "common/utf8.h"
#include "skip_index/grams.h"
#include "skip_index/literals.h"
#include "skip_index/regex_literals.h"
#include "skip_index/sql_tokens.h"

namespace kelo::platform {
namespace {

using Tokens = std::span<const SqlToken>;
using Kind = SqlToken::Kind;

constexpr size_t kMostGrams = 24; // of one literal: one in 10^9 blocks has as many by chance
constexpr int kMaxDepth = 50;     // of brackets
constexpr size_t kMostGramsOfAll = 1024;
// SQLite refuses longer patterns when it meets a row, which an empty search would hide.
constexpr size_t kMaxPatternBytes = 40'000;
// Words with which AND and OR mean something else, or a condition reaches beyond its row.
constexpr std::string_view kForeignWords[] = {
    "between", "case",   "collate", "exists",    "except", "filter", "from",
    "group",   "having", "indexed", "intersect", "limit",  "offset", "order",
    "over",    "raise",  "select",  "union",     "where",  "window", "with"};
constexpr std::string_view kColumnWords[] = {"llevel", "fac", "utcsec", "ldate"};
constexpr std::string_view kIdWords[] = {"id", "rowid", "oid", "_rowid_"};

// Where the bracket that opens at `open` closes; tokens.size() if it does not.
size_t ClosingBracket(Tokens tokens, size_t open) {
    size_t depth = 0;
    for (size_t at = open; at < tokens.size(); ++at) {
        depth += tokens[at].Is('(') ? 1 : 0;
        if (tokens[at].Is(')') && --depth == 0)
            return at;
    }
    return tokens.size();
}

// Whether the brackets are balanced, and not deeper than what is written by hand or for a keyword.
bool HasPlainBrackets(Tokens tokens) {
    int depth = 0;
    for (const SqlToken &token : tokens) {
        depth += token.Is('(') ? 1 : token.Is(')') ? -1 : 0;
        if (depth < 0 || depth > kMaxDepth)
            return false;
    }
    return depth == 0;
}

// The parts between the `word`s outside of brackets. The brackets are balanced.
std::vector<Tokens> Split(Tokens tokens, std::string_view word) {
    std::vector<Tokens> parts;
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

// The tokens without brackets around all of them.
Tokens Bare(Tokens tokens) {
    while (tokens.size() > 2 && tokens[0].Is('(') && ClosingBracket(tokens, 0) == tokens.size() - 1)
        tokens = tokens.subspan(1, tokens.size() - 2);
    return tokens;
}

std::string_view TextOf(Tokens tokens) {
    const char *begin = tokens.front().text.data();
    const char *end = tokens.back().text.data() + tokens.back().text.size();
    return {begin, static_cast<size_t>(end - begin)};
}

// Whether the tokens are these: a word or a symbol each, "'" for a string.
bool AreLike(Tokens tokens, std::initializer_list<std::string_view> form) {
    return std::equal(tokens.begin(), tokens.end(), form.begin(), form.end(),
                      [](const SqlToken &token, std::string_view expected) {
                          if (token.kind == Kind::kString)
                              return expected == "'";
                          return token.kind == Kind::kWord ? token.Is(expected) : token.text == expected;
                      });
}

Need NeedOf(const std::vector<std::string> &literals) {
    Need need;
    for (const std::string &literal : literals) {
        const std::vector<uint16_t> grams = BitsOfLiteral(literal, kMostGrams);
        need.grams.insert(need.grams.end(), grams.begin(), grams.end());
    }
    if (!need.grams.empty())
        need.kind = Need::Kind::kGrams;
    return need;
}

Need NeedOfRegex(const std::string &regex, bool ignoreCase) {
    Need any{Need::Kind::kAny, {}, {}};
    for (const std::vector<std::string> &literals : LiteralsOfRegex(regex, ignoreCase)) {
        any.parts.push_back(NeedOf(literals));
        if (any.parts.back().kind == Need::Kind::kNothing)
            return {};
    }
    return any.parts.empty() ? Need{} : any;
}

std::optional<int64_t> NumberOf(const SqlToken &token) {
    int64_t number = 0;
    const char *end = token.text.data() + token.text.size();
    const auto [stop, error] = std::from_chars(token.text.data(), end, number);
    return token.kind == Kind::kNumber && error == std::errc() && stop == end ? std::optional(number)
                                                                              : std::nullopt;
}

// Narrows a range by a comparison with its values. False for another comparison.
bool Narrow(std::string_view comparison, int64_t value, int64_t &first, int64_t &last) {
    if (comparison == ">" && value < std::numeric_limits<int64_t>::max())
        first = std::max(first, value + 1);
    else if (comparison == "<" && value > std::numeric_limits<int64_t>::min())
        last = std::min(last, value - 1);
    else if (comparison == ">=")
        first = std::max(first, value);
    else if (comparison == "<=")
        last = std::min(last, value);
    else
        return false;
    return true;
}

// Of "utcsec >= 1577836800" or "ldate = '2020/01/02'".
Need NeedOfTime(Tokens tokens, TimeColumn column, std::optional<int64_t> value) {
    Need need{.kind = Need::Kind::kTimes, .column = column, .times = kAllTimes};
    if (!value)
        return {};
    if (tokens[1].Is('='))
        need.times = {*value, *value};
    else if (!Narrow(tokens[1].text, *value, need.times.first, need.times.last))
        return {};
    return need;
}

Need NeedOfToken(TokenColumn column, const std::string &value) {
    const auto bits = BitsOfToken(column, value);
    return {.kind = Need::Kind::kGrams, .grams = {bits.begin(), bits.end()}};
}

// Of a condition without AND and OR.
Need NeedOfComparison(Tokens tokens) {
    const auto string = [&](size_t at) { return StringValue(tokens[at]); };
    if (AreLike(tokens, {"msg", "like", "'"}) && IsUtf8(string(2)))
        return NeedOf(LiteralsOfLike(string(2), '\0'));
    if (AreLike(tokens, {"msg", "like", "'", "escape", "'"}) && IsUtf8(string(2)) && string(4).size() == 1)
        return NeedOf(LiteralsOfLike(string(2), string(4)[0]));
    if (AreLike(tokens, {"msg", "glob", "'"}) && IsUtf8(string(2)))
        return NeedOf(LiteralsOfGlob(string(2)));
    if (AreLike(tokens, {"instr", "(", "msg", ",", "'", ")", ">", "0"}))
        return NeedOf({string(4)});
    if (AreLike(tokens, {"instr", "(", "lower", "(", "msg", ")", ",", "'", ")", ">", "0"}))
        return NeedOf({string(7)});
    if (AreLike(tokens, {"regexp", "(", "'", ",", "msg", ")"}))
        return NeedOfRegex(string(2), false);
    if (AreLike(tokens, {"regexpi", "(", "'", ",", "msg", ")"}))
        return NeedOfRegex(string(2), true);
    if (AreLike(tokens, {"llevel", "=", "'"}))
        return NeedOfToken(TokenColumn::kSeverity, string(2));
    if (AreLike(tokens, {"fac", "=", "'"}))
        return NeedOfToken(TokenColumn::kFacility, string(2));
    if (tokens.size() == 3 && tokens[0].Is("utcsec"))
        return NeedOfTime(tokens, TimeColumn::kSecond, NumberOf(tokens[2]));
    if (tokens.size() == 3 && tokens[0].Is("ldate") && tokens[2].kind == Kind::kString)
        return NeedOfTime(tokens, TimeColumn::kDay, NumberOfDay(string(2)));
    return {};
}

Need NeedOfCondition(Tokens tokens);

// All of the parts are needed, or one of them.
Need Combined(Need::Kind kind, const std::vector<Tokens> &parts) {
    Need need{kind, {}, {}};
    for (const Tokens part : parts) {
        Need partial = NeedOfCondition(part);
        if (partial.kind != Need::Kind::kNothing)
            need.parts.push_back(std::move(partial));
        else if (kind == Need::Kind::kAny)
            return {};
    }
    return need.parts.empty() ? Need{} : need;
}

Need NeedOfCondition(Tokens tokens) {
    tokens = Bare(tokens);
    if (const std::vector<Tokens> parts = Split(tokens, "or"); parts.size() > 1)
        return Combined(Need::Kind::kAny, parts);
    if (const std::vector<Tokens> parts = Split(tokens, "and"); parts.size() > 1)
        return Combined(Need::Kind::kAll, parts);
    return NeedOfComparison(tokens);
}

size_t CountGrams(const Need &need) {
    return std::accumulate(need.parts.begin(), need.parts.end(), need.grams.size(),
                           [](size_t count, const Need &part) { return count + CountGrams(part); });
}

bool NeedsGrams(const Need &need) {
    return need.kind == Need::Kind::kGrams || std::any_of(need.parts.begin(), need.parts.end(), NeedsGrams);
}

bool HasWord(Tokens tokens, std::span<const std::string_view> words) {
    return std::any_of(tokens.begin(), tokens.end(), [&](const SqlToken &token) {
        return std::any_of(words.begin(), words.end(), [&](std::string_view word) { return token.Is(word); });
    });
}

bool HasLongPattern(Tokens tokens) {
    return std::any_of(tokens.begin(), tokens.end(), [](const SqlToken &token) {
        return token.kind == Kind::kString && token.text.size() > kMaxPatternBytes;
    });
}

// Narrows `range` by a condition "id >= 1". False for anything else.
bool TakeIdCondition(Tokens tokens, IdRange &range) {
    tokens = Bare(tokens);
    if (tokens.size() != 3 || !tokens[0].Is("id"))
        return false;
    const std::optional<int64_t> id = NumberOf(tokens[2]);
    return id && Narrow(tokens[1].text, *id, range.first, range.last);
}

struct Head {
    SearchText::Kind kind;
    std::initializer_list<std::string_view> form;
};
const Head kHeads[] = {
    {SearchText::Kind::kSelect, {"select", "*", "from", "logs", "where"}},
    {SearchText::Kind::kCount, {"select", "count", "(", "*", ")", "from", "logs", "where"}},
    {SearchText::Kind::kDelete, {"delete", "from", "logs", "where"}},
};

// Takes the head off the tokens.
bool TakeHead(Tokens &tokens, SearchText &search) {
    for (const Head &head : kHeads) {
        const size_t size = head.form.size();
        if (tokens.size() <= size || !AreLike(tokens.first(size), head.form))
            continue;
        search.kind = head.kind;
        search.head = TextOf(tokens.first(size - 1));
        tokens = tokens.subspan(size);
        return true;
    }
    return false;
}

// Takes an order by id off the end.
void TakeOrder(Tokens &tokens, SearchText &search) {
    if (tokens.size() <= 4 || search.kind == SearchText::Kind::kDelete)
        return;
    const Tokens order = tokens.last(4);
    if (AreLike(order, {"order", "by", "id", "asc"}))
        search.order = SearchText::Order::kAscending;
    else if (AreLike(order, {"order", "by", "id", "desc"}))
        search.order = SearchText::Order::kDescending;
    else
        return;
    tokens = tokens.first(tokens.size() - 4);
}

// Most statements are others; this sees it without taking them apart.
bool MayBeSearch(std::string_view sql) {
    return (sql.starts_with("SELECT *") || sql.starts_with("SELECT COUNT(*)") ||
            sql.starts_with("DELETE ")) &&
           (sql.find("msg") != std::string_view::npos ||
            std::any_of(std::begin(kColumnWords), std::end(kColumnWords),
                        [&](std::string_view column) { return sql.find(column) != std::string_view::npos; }));
}

std::string Joined(const std::vector<std::string_view> &conditions) {
    std::string text;
    for (const std::string_view condition : conditions)
        text.append(text.empty() ? "(" : " AND (").append(condition).append(")");
    return text;
}

} // namespace

std::optional<SearchText> ReadSearchText(std::string_view sql) {
    if (!MayBeSearch(sql))
        return std::nullopt;
    const auto all = ReadSqlTokens(sql);
    if (!all)
        return std::nullopt;
    SearchText search;
    Tokens tokens = *all;
    if (!TakeHead(tokens, search))
        return std::nullopt;
    TakeOrder(tokens, search);
    if (!HasPlainBrackets(tokens) || HasWord(tokens, kForeignWords) || HasLongPattern(tokens))
        return std::nullopt;
    const bool isConjunction = Split(tokens, "or").size() == 1;
    search.need.kind = Need::Kind::kAll;
    for (const Tokens condition : isConjunction ? Split(tokens, "and") : std::vector<Tokens>{tokens}) {
        if (condition.empty())
            return std::nullopt;
        if (TakeIdCondition(condition, search.ids))
            continue;
        if (HasWord(condition, kIdWords)) // SQLite may find the rows by it
            return std::nullopt;
        search.conditions.push_back(TextOf(condition));
        Need need = NeedOfCondition(condition);
        const bool isNothing = need.kind == Need::Kind::kNothing;
        if ((isNothing && Bare(condition).size() > 1) || HasWord(condition, kColumnWords))
            search.isTextOnly = false;
        if (!isNothing)
            search.need.parts.push_back(std::move(need));
    }
    std::vector<Need> &parts = search.need.parts;
    // What times rule out is quickly seen.
    const auto grams = std::stable_partition(parts.begin(), parts.end(), std::not_fn(NeedsGrams));
    search.needsTimes = grams != parts.begin();
    search.needsGrams = grams != parts.end();
    for (const std::string_view column : {"ldate", "utcsec"}) {
        if (!ConditionsOn(search, column).empty())
            search.times.push_back(column);
    }
    if (parts.empty())
        search.need.kind = Need::Kind::kNothing;
    if ((parts.empty() && search.times.empty()) || CountGrams(search.need) > kMostGramsOfAll)
        return std::nullopt;
    return search;
}

std::string AllConditions(const SearchText &search) {
    return Joined(search.conditions);
}

std::string ConditionsOn(const SearchText &search, std::string_view column) {
    std::vector<std::string_view> found;
    for (const std::string_view condition : search.conditions) {
        const auto tokens = ReadSqlTokens(condition);
        const auto isOther = [&](const SqlToken &token) {
            return token.kind == Kind::kWord && !token.Is(column) && !token.Is("or") && !token.Is("and");
        };
        if (tokens && std::none_of(tokens->begin(), tokens->end(), isOther) &&
            std::any_of(tokens->begin(), tokens->end(),
                        [&](const SqlToken &token) { return token.Is(column); }))
            found.push_back(condition);
    }
    return Joined(found);
}

} // namespace kelo::platform
