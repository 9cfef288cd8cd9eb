#include "skip_index/need.h"

#include <algorithm>
#include <limits>
#include <numeric>
#include <optional>
#include <string>
#include <utility>

#include "common/utf8.h"
#include "skip_index/grams.h"
#include "skip_index/literals.h"
#include "skip_index/regex_literals.h"

namespace kelo::platform {
namespace {

constexpr size_t kMostBitsOfLiteral = 24; // of one literal: one in 10^8 blocks has as many by chance

Need NeedOf(const std::vector<std::string> &literals) {
    Need need;
    for (const std::string &literal : literals) {
        const std::vector<uint16_t> bits = BitsOfLiteral(literal, kMostBitsOfLiteral);
        need.bits.insert(need.bits.end(), bits.begin(), bits.end());
    }
    if (!need.bits.empty())
        need.kind = Need::Kind::kBits;
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

// Of "utcsec >= 1577836800" or "ldate = '2020/01/02'".
Need NeedOfTime(SqlTokens tokens, TimeColumn column, std::optional<int64_t> value) {
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
    return {.kind = Need::Kind::kBits, .bits = {bits.begin(), bits.end()}};
}

// Of a condition without AND and OR.
Need NeedOfComparison(SqlTokens tokens) {
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
        return NeedOfTime(tokens, TimeColumn::kSecond, IntegerValue(tokens[2]));
    if (tokens.size() == 3 && tokens[0].Is("ldate") && tokens[2].kind == SqlToken::Kind::kString)
        return NeedOfTime(tokens, TimeColumn::kDay, NumberOfDay(string(2)));
    return {};
}

// All of the parts are needed, or one of them.
Need Combined(Need::Kind kind, const std::vector<SqlTokens> &parts) {
    Need need{kind, {}, {}};
    for (const SqlTokens part : parts) {
        Need partial = NeedOfCondition(part);
        if (partial.kind != Need::Kind::kNothing)
            need.parts.push_back(std::move(partial));
        else if (kind == Need::Kind::kAny)
            return {};
    }
    return need.parts.empty() ? Need{} : need;
}

} // namespace

Need NeedOfCondition(SqlTokens tokens) {
    tokens = Bare(tokens);
    if (const std::vector<SqlTokens> parts = Split(tokens, "or"); parts.size() > 1)
        return Combined(Need::Kind::kAny, parts);
    if (const std::vector<SqlTokens> parts = Split(tokens, "and"); parts.size() > 1)
        return Combined(Need::Kind::kAll, parts);
    return NeedOfComparison(tokens);
}

bool NeedsBits(const Need &need) {
    return need.kind == Need::Kind::kBits || std::any_of(need.parts.begin(), need.parts.end(), NeedsBits);
}

size_t CountBits(const Need &need) {
    return std::accumulate(need.parts.begin(), need.parts.end(), need.bits.size(),
                           [](size_t count, const Need &part) { return count + CountBits(part); });
}

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

} // namespace kelo::platform
