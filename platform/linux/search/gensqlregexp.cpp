#include "keloplatform/gensqlregexp.h"

#include <syslog.h>

#include <algorithm>
#include <set>
#include <string_view>
#include <vector>

#include "common/failure.h"
#include "common/utf8.h"
#include "keloplatform/errors.h"
#include "search/keyword.h"
#include "search/term_sql.h"

namespace kelo::platform {
namespace {

// SQLite accepts expressions of a depth up to 1000, and a chain is as deep as it is long: more operands than
// this become a tree.
constexpr size_t kMaxChain = 100;
constexpr size_t kMaxReportedBytes = 200;

// Free text for a log line: shortened, with control bytes made visible.
std::string Printable(std::string_view text) {
    constexpr char kHexDigits[] = "0123456789abcdef";
    std::string printable;
    for (const char byte : text.substr(0, kMaxReportedBytes)) {
        const auto code = static_cast<unsigned char>(byte);
        if (code >= 0x20 && code != 0x7F)
            printable += byte;
        else
            printable.append("\\x").append(1, kHexDigits[code >> 4]).append(1, kHexDigits[code & 0xF]);
    }
    return text.size() > kMaxReportedBytes ? printable + "..." : printable;
}

// The operands joined into one that can be used with any operator; `operands` is not empty.
std::string Joined(std::vector<std::string> operands, const char *separator) {
    while (operands.size() > 1) {
        std::vector<std::string> joined;
        for (size_t first = 0; first < operands.size(); first += kMaxChain) {
            const size_t end = std::min(first + kMaxChain, operands.size());
            std::string &chain = joined.emplace_back("(" + operands[first]);
            for (size_t next = first + 1; next < end; ++next)
                chain.append(separator).append(operands[next]);
            chain += ")";
        }
        operands = std::move(joined);
    }
    return operands.front();
}

class Generator {
public:
    explicit Generator(std::string column) : column_(std::move(column)) {}

    std::string Sql(std::string keyword) {
        // No SQL text can carry a NUL, and no searched text has one.
        std::replace(keyword.begin(), keyword.end(), '\0', ' ');
        const std::vector<Alternatives> groups = ParseKeyword(ToUtf8(keyword));
        if (std::all_of(groups.begin(), groups.end(), MatchesEveryText))
            return MatchAllSql(column_);
        std::vector<std::string> operands;
        operands.reserve(groups.size());
        for (const Alternatives &group : groups)
            operands.push_back(GroupSql(group));
        return Joined(std::move(operands), " AND ");
    }

    // One line for each invalid regex of that keyword.
    std::vector<std::string> Problems() const {
        std::vector<std::string> problems;
        std::set<std::string> known;
        for (const auto &[regex, reason] : broken_) {
            if (known.insert(regex).second)
                problems.push_back("Broken regular expression [" + Printable(regex) +
                                   "] in a search keyword matches nothing: " + Printable(reason));
        }
        return problems;
    }

private:
    static bool MatchesEveryText(const Alternatives &group) {
        return group.size() == 1 && group[0].MatchesEveryText() && !group[0].excluded;
    }

    std::string GroupSql(const Alternatives &group) {
        std::vector<std::string> operands;
        operands.reserve(group.size());
        for (const Term &term : group)
            operands.push_back(TermSql(term, column_, broken_));
        return Joined(std::move(operands), " OR ");
    }

    std::string column_;
    std::vector<BrokenRegex> broken_;
};

} // namespace
} // namespace kelo::platform

std::string GenSQLRegexp(std::string pattern, std::string column) {
    kelo::platform::Generator generator(std::move(column));
    std::string sql = generator.Sql(std::move(pattern));
    for (const std::string &problem : generator.Problems()) {
        syslog(LOG_ERR, "%s", problem.c_str());
        kelo::platform::Fail(KELO_FAILURE_REGEX, "GenSQLRegexp", "", problem);
    }
    return sql;
}

std::string KELOKeywordError(const std::string &pattern) {
    kelo::platform::Generator generator("text");
    generator.Sql(pattern);
    const std::vector<std::string> problems = generator.Problems();
    return problems.empty() ? "" : problems.front();
}
