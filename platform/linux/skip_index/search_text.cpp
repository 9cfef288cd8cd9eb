#include "skip_index/search_text.h"

#include <algorithm>
#include <functional>
#include <initializer_list>
#include <utility>

#include "skip_index/sql_tokens.h"

namespace kelo::platform {
namespace {

constexpr size_t kMostBitsOfAll = 1024;
// SQLite refuses longer patterns when it meets a row, which an empty search would hide.
constexpr size_t kMaxPatternBytes = 40'000;
// Words with which AND and OR mean something else, or a condition reaches beyond its row.
constexpr std::string_view kForeignWords[] = {
    "between", "case",   "collate", "exists",    "except", "filter", "from",
    "group",   "having", "indexed", "intersect", "limit",  "offset", "order",
    "over",    "raise",  "select",  "union",     "where",  "window", "with"};
constexpr std::string_view kColumnWords[] = {"llevel", "fac", "utcsec", "ldate"};
constexpr std::string_view kIdWords[] = {"id", "rowid", "oid", "_rowid_"};

bool HasLongPattern(SqlTokens tokens) {
    return std::any_of(tokens.begin(), tokens.end(), [](const SqlToken &token) {
        return token.kind == SqlToken::Kind::kString && token.text.size() > kMaxPatternBytes;
    });
}

// Narrows `range` by a condition "id >= 1". False for anything else.
bool TakeIdCondition(SqlTokens tokens, IdRange &range) {
    tokens = Bare(tokens);
    if (tokens.size() != 3 || !tokens[0].Is("id"))
        return false;
    const std::optional<int64_t> id = IntegerValue(tokens[2]);
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
bool TakeHead(SqlTokens &tokens, SearchText &search) {
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
void TakeOrder(SqlTokens &tokens, SearchText &search) {
    if (tokens.size() <= 4 || search.kind == SearchText::Kind::kDelete)
        return;
    const SqlTokens order = tokens.last(4);
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
    SqlTokens tokens = *all;
    if (!TakeHead(tokens, search))
        return std::nullopt;
    TakeOrder(tokens, search);
    if (!HasPlainBrackets(tokens) || HasWord(tokens, kForeignWords) || HasLongPattern(tokens))
        return std::nullopt;
    const bool isConjunction = Split(tokens, "or").size() == 1;
    search.need.kind = Need::Kind::kAll;
    for (const SqlTokens condition : isConjunction ? Split(tokens, "and") : std::vector<SqlTokens>{tokens}) {
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
    const auto bits = std::stable_partition(parts.begin(), parts.end(), std::not_fn(NeedsBits));
    search.needsTimes = bits != parts.begin();
    search.needsBits = bits != parts.end();
    for (const std::string_view column : {"ldate", "utcsec"}) {
        if (!ConditionsOn(search, column).empty())
            search.times.push_back(column);
    }
    if (parts.empty())
        search.need.kind = Need::Kind::kNothing;
    if ((parts.empty() && search.times.empty()) || CountBits(search.need) > kMostBitsOfAll)
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
            return token.kind == SqlToken::Kind::kWord && !token.Is(column) && !token.Is("or") &&
                   !token.Is("and");
        };
        if (tokens && std::none_of(tokens->begin(), tokens->end(), isOther) &&
            std::any_of(tokens->begin(), tokens->end(),
                        [&](const SqlToken &token) { return token.Is(column); }))
            found.push_back(condition);
    }
    return Joined(found);
}

} // namespace kelo::platform
