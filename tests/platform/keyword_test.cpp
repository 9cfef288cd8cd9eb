#include <gmock/gmock.h>
#include <sqlite3.h>
#include <syslog.h>

#include <memory>
#include <set>
#include <string>
#include <vector>

#include "keloplatform/gensqlregexp.h"
#include "keloplatform/kelodb.h"
#include "platform/search_table.h"
#include "support/syslog_capture.h"

namespace kelo::test {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using Texts = std::vector<std::string>;

// What a keyword finds among the texts, which are tried with and without a row that is NULL.
Texts Found(const std::string &keyword, const Texts &texts) {
    return SearchTable(texts).Matching(keyword);
}

struct Example {
    std::string keyword;
    Texts matching;
    Texts other;
};

TEST(Keyword, FindsWhatTheLanguageSays) {
    const std::vector<Example> examples = {
        // Terms and phrases.
        {"disk full", {"disk is full", "fullest disk"}, {"disk", "full"}},
        {"\t disk\n", {"a disk"}, {"dis k"}},
        {"\"disk full\"", {"the disk full"}, {"disk is full", "disk  full"}},
        {"\"disk fu", {"the disk full"}, {"disk is full"}},
        {"\"a*?b\"", {"xa*?bx"}, {"axb", "a*b"}},
        {R"("say \"hi\" c:\dir\\")", {R"(say "hi" c:\dir\)"}, {R"(say hi c:\dir\)"}},
        {"\"one\"two", {"two one"}, {"one", "two"}},
        {"user=\"root\"", {"user=\"root\" "}, {"user=root"}},
        {"5\" \"", {"5\"", "a 5\""}, {"5"}},
        // Letter case: decided by ASCII capitals, term by term, for ASCII letters.
        {"error", {"error", "ERROR", "an Error"}, {"err"}},
        {"Error disk", {"Error DISK"}, {"error disk", "ERROR disk"}},
        {"é", {"é"}, {"É", "e"}},
        {"É x", {"É X"}, {"é x"}},
        // OR binds tighter than the blank, and is a word where it joins nothing.
        {"a b OR c d", {"abd", "acd"}, {"ab", "ad", "bcd", "d"}},
        {"x OR y OR z", {"x", "y", "z"}, {"w"}},
        {"OR", {"xORx"}, {"or", "x"}},
        {"OR b", {"OR b"}, {"b"}},
        {"b OR", {"b OR"}, {"b"}},
        {"a OR OR", {"a", "OR"}, {"or", "b"}},
        {"a \"OR\" b", {"a OR b"}, {"a", "b", "a or b"}},
        {"a or b", {"b or a"}, {"a b"}},
        // Exclusion.
        {"-debug", {"info"}, {"DEBUG", "a debug b"}},
        {"a -b OR -c", {"a", "ab", "ac"}, {"abc", "b"}},
        {"-\"b c\"", {"bc"}, {"ab c"}},
        {"-/b+c/", {"b c"}, {"abbc"}},
        {"- x", {"x-"}, {"x"}},
        {"--x", {"x", "-"}, {"a-x"}},
        {"-*", {}, {"", "x"}},
        {R"(\-x)", {"a-x"}, {"x"}},
        {"a-b", {"a-b"}, {"a"}},
        // Wildcards, and how to search for them.
        {"a*c", {"ac", "xabcx", "a\nc"}, {"ca", "ab"}},
        {"a?c", {"abc", "aéc", "xa cx"}, {"ac", "abbc"}},
        {"?", {"x", "é"}, {""}},
        {"A*C", {"AxC"}, {"axc"}},
        {R"(a\*c\?)", {"a*c?"}, {"abc?", "a*cd"}},
        {R"(\"x)", {"\"x"}, {"x"}},
        {"*x*", {"x", "axb"}, {"y"}},
        {"a *", {"a", "ba"}, {"b"}},
        {"a OR *", {"a", "b", ""}, {}},
        {"\"\"", {"a", ""}, {}},
        // What SQL treats specially.
        {"100%", {"100%"}, {"1000"}},
        {"a_b 50%", {"A_B 50%"}, {"axb 50%", "a_b 50"}},
        {"[ufw", {"x [UFW block]"}, {"ufw"}},
        {"[UFW *BLOCK]", {"[UFW 1BLOCK]"}, {"[UFW BLOCK", "U BLOCK]"}},
        {"[a-z]", {"[a-z]"}, {"b"}},
        {"[9]", {"x[9]"}, {"9"}},
        {"A[*]", {"A[x]"}, {"A*", "Ax"}},
        {"it's", {"IT'S"}, {"its"}},
        {R"(c:\windows)", {R"(C:\Windows)"}, {"c:windows"}},
        {R"(C:\W)", {R"(C:\W)"}, {R"(c:\w)"}},
        {R"(a\)", {R"(a\)"}, {"a"}},
        // Regular expressions, and paths that are none.
        {"/fail(ed|ure)/", {"Failed", "failure"}, {"fail"}},
        {"/Fail/", {"Fail"}, {"fail"}},
        {R"(/^\S+ \pL\x2D\p{Greek}?$/)", {"AB c-"}, {"a b c-"}},
        {"/(?P<Name>x)(?U:y)/", {"XY"}, {"x"}},
        {"/(?i)Fail/", {"fail"}, {"x"}},
        {"/a b/ c", {"a bc"}, {"ab c"}},
        {R"(/a\/b\\/)", {R"(a/b\)"}, {"a/b", "ab"}},
        {"/var/log", {"in /var/log/x"}, {"var/log"}},
        {"/var /usr/", {"/var /usr"}, {"var usr", "/var"}},
        {"// /x", {"x///x"}, {"x"}},
        {R"(\/etc/)", {"/etc/x"}, {"etc"}},
        {"it's /it's/", {"it's"}, {"its"}},
        // Bytes that are not UTF-8 count as Latin-1 in keywords, and in rows for regexes.
        {"caf\xe9", {"café"}, {"caf\xc3", "cafe"}},
        {"/caf\xe9 .$/", {"caf\xe9 \xff", "CAFÉ x"}, {"cafe x"}},
        {"/\xed\xa0\x80/", {"\xc3\xad\xc2\xa0\xc2\x80"}, {"x"}},
        {"a?b",
         {"a\xff"
          "b"},
         {"ab"}},
        {std::string("a\0b", 3), {"b a"}, {"a"}},
    };
    for (const auto &[keyword, matching, other] : examples) {
        Texts all = matching;
        all.insert(all.end(), other.begin(), other.end());
        EXPECT_EQ(Found(keyword, all), matching)
            << "keyword: " << keyword << "\nSQL: " << GenSQLRegexp(keyword, "msg");
    }
}

TEST(Keyword, GivesTheMatchAllTextExactlyWhenItFiltersNothing) {
    for (const char *keyword : {"*", " * ", "\t*\n", "**", "* *", "", "  "})
        EXPECT_EQ(GenSQLRegexp(keyword, "msg"), "msg GLOB '**'") << '[' << keyword << ']';
    EXPECT_EQ(GenSQLRegexp("*", "prog"), "prog GLOB '**'");
    for (const char *keyword : {"-*", "?", "\"*\"", "* a", "\\*"})
        EXPECT_NE(GenSQLRegexp(keyword, "msg"), "msg GLOB '**'") << '[' << keyword << ']';
}

TEST(Keyword, KeepsNullOnlyWhereTermsExclude) {
    const SearchTable table({"a"});
    for (const char *keyword : {"-x", "-*", "-\"[\"", "-/x/", "-x -y", "b OR -x"})
        EXPECT_TRUE(table.MatchesNull(keyword)) << keyword;
    for (const char *keyword : {"*", "?", "a", "A", "[", "/a/", "a OR b", "-x a"})
        EXPECT_FALSE(table.MatchesNull(keyword)) << keyword;
}

TEST(Keyword, ReportsABrokenRegexOnceAndMatchesNothingByIt) {
    SyslogCapture log;
    EXPECT_THAT(Found("/[b\x1b%s/", {"[b", "x"}), IsEmpty());
    ASSERT_EQ(log.Messages().size(), 1U);
    EXPECT_EQ(log.Messages()[0].priority, LOG_ERR);
    EXPECT_EQ(log.Messages()[0].text,
              "Broken regular expression [[b\\x1b%s] in a search keyword matches nothing: "
              "missing ]: [b\\x1b%s");
    log.Clear();
    EXPECT_THAT(Found("-/(/", {"("}), IsEmpty()); // a slip must not make a deletion larger
    EXPECT_EQ(log.Messages().size(), 1U);
    log.Clear();
    EXPECT_THAT(Found("a OR /(/ /)/ OR /(/ OR a", {"a", "("}), ElementsAre("a"));
    EXPECT_EQ(log.Messages().size(), 2U);
    log.Clear();
    EXPECT_THAT(Found("/" + std::string(200000, '(') + "/", {"("}), IsEmpty());
    ASSERT_EQ(log.Messages().size(), 1U);
    EXPECT_LT(log.Messages()[0].text.size(), 600U);
}

std::string Repeated(const std::string &text, int count) {
    std::string repeated;
    for (int i = 0; i < count; ++i)
        repeated += text;
    return repeated;
}

std::string Numbered(const std::string &before, const std::string &after, int count) {
    std::string numbered;
    for (int i = 0; i < count; ++i)
        numbered += before + std::to_string(i) + after;
    return numbered;
}

TEST(Keyword, StaysWithinSqlitesLimitsWhateverItsSize) {
    const std::string letters = Repeated("abcdefghij", 4'100);
    const std::string numbers = Numbered("t", " ", 3'000);
    const std::string odd = "a'%_[\\";
    const Texts texts = {letters, numbers, odd};
    const std::vector<std::pair<std::string, Texts>> examples = {
        {letters, {letters}},
        {"-" + letters, {numbers, odd}},
        {letters + "X", {}},
        {"[" + letters, {}},
        {Repeated("a*j", 900), {letters}},
        {Repeated("a*j", 1'100), {letters}}, // more stars than GLOB and LIKE are asked for
        {Repeated("?", 10'000), {letters, numbers}},
        {"x*" + letters, {}},
        {Numbered("t", " ", 3'000), {numbers}},
        {Numbered("x", " OR ", 20'000) + "T", {}},
        {Numbered("t", " OR zz ", 3'000), {numbers}},
        {Numbered("-y", " ", 3'000), texts},
        {Numbered("Y", " ", 20'000), {}},
        {Numbered("/t", "/ ", 500), {numbers}},
        {Repeated("'%_[\\", 20'000), {}},
    };
    const SearchTable table(texts);
    SyslogCapture log;
    for (const auto &[keyword, matching] : examples)
        EXPECT_TRUE(table.Matching(keyword) == matching) << keyword.substr(0, 40) << ": " << table.Error();
    EXPECT_THAT(log.Messages(), IsEmpty());
}

TEST(Keyword, StandsAsOneOperand) {
    const SearchTable table({"a", "b", "c"});
    EXPECT_EQ(table.CountWhere("id = 1 AND " + GenSQLRegexp("a OR b", "msg")), 1);
    EXPECT_EQ(table.CountWhere("NOT " + GenSQLRegexp("a OR b", "msg")), 1);
    EXPECT_EQ(table.CountWhere("id = 3 OR NOT " + GenSQLRegexp("-a b", "msg") + " AND msg NOTNULL"), 2);
}

TEST(SearchFunctions, AnswerAsDocumentedWhenCalledFromSql) {
    const SearchTable table({"abc", "ABC"});
    EXPECT_EQ(table.CountWhere("msg REGEXP '^a.c$'"), 1);
    EXPECT_EQ(table.CountWhere("regexpi(substr('abd', 1, id + 1), msg)"), 1); // no constant: compiled per row
    EXPECT_EQ(table.CountWhere("regexp(NULL, msg) IS NULL"), 3);
    EXPECT_EQ(table.CountWhere("regexp('b', 'a' || char(0) || 'b')"), 0); // as GLOB and LIKE see the text
    EXPECT_EQ(table.CountWhere("regexp('[', msg)"), -1);
    EXPECT_THAT(table.Error(), HasSubstr("/[/: missing ]"));
    EXPECT_EQ(table.Run("CREATE VIEW v AS SELECT * FROM logs WHERE regexp('a', msg)"), 0);
    EXPECT_EQ(table.Run("SELECT * FROM v"), -1); // a damaged or foreign file cannot call them
}

} // namespace
} // namespace kelo::test
