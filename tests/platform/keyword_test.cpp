#include "keloplatform/errors.h"
#include "keloplatform/gensqlregexp.h"
#include "platform/db_fixture.h"

namespace kelo::test {
namespace {

using Texts = std::vector<std::string>;

// A table "logs" of texts (column "msg") and one row whose text is NULL, searched through the platform.
class SearchTable {
public:
    explicit SearchTable(const Texts &texts) : texts_(texts) {
        const std::string path = root_.File("logs.db");
        CreateLogDatabase(path);
        for (const std::string &text : texts) {
            _SYSLOG_LOG_DATA_tag log;
            log.msg = text;
            InsertLogs(path, {log});
        }
        RunSql(path, "INSERT INTO logs(id) VALUES(0)");
        connection_ = ConnectTo(path);
    }

    // The texts that the keyword finds, in their order. A statement that fails gives its error text.
    Texts Matching(const std::string &keyword) const {
        const Outcome outcome =
            Execute(connection_,
                    "SELECT id FROM logs WHERE id > 0 AND (" + GenSQLRegexp(keyword, "msg") + ") ORDER BY id",
                    {"id"});
        Texts found;
        for (const auto &row : outcome.rows)
            found.push_back(texts_[std::stoul(*row[0]) - 1]);
        if (outcome.status != 0)
            found.push_back(outcome.error);
        return found;
    }
    // How many rows a condition is true for; -1 when the statement fails.
    int CountWhere(const std::string &condition) const {
        const Outcome outcome = Execute(connection_, "SELECT id FROM logs WHERE " + condition);
        return outcome.status == 0 ? static_cast<int>(outcome.rows.size()) : -1;
    }
    const Connection &Database() const { return connection_; }

private:
    TempRoot root_;
    Texts texts_;
    Connection connection_;
};

TEST(Keyword, FindsWhatTheLanguageSays) {
    const struct {
        std::string keyword;
        Texts matching, other;
    } examples[] = {
        // Terms and phrases.
        {"\t disk\n", {"a disk"}, {"dis k"}},
        {"\"disk fu", {"the disk full"}, {"disk is full"}},
        {R"("say \"hi\" c:\dir\\")", {R"(say "hi" c:\dir\)"}, {R"(say hi c:\dir\)"}},
        // Letter case: decided by ASCII capitals, term by term, for ASCII letters.
        {"é", {"é"}, {"É", "e"}},
        {"É x", {"É X"}, {"é x"}},
        // OR is a word where it joins nothing.
        {"OR", {"xORx"}, {"or", "x"}},
        {"a \"OR\" b", {"a OR b"}, {"a", "b", "a or b"}},
        // Exclusion.
        {"--x", {"x", "-"}, {"a-x"}},
        // Wildcards.
        {"a?c", {"abc", "aéc", "xa cx"}, {"ac", "abbc"}},
        {"\"\"", {"a", ""}, {}},
        // Regular expressions, and paths that are none.
        {"x OR -/B+c%?'/ a", {"ab", "abbc'"}, {"aBc%'"}},
        {R"(/^\S+ \pL\x2D\p{Greek}?$/)", {"AB c-"}, {"a b c-"}},
        {"/(?P<Name>x)(?U:y)/", {"XY"}, {"x"}},
        {R"(/a\/b\\/)", {R"(a/b\)"}, {"a/b", "ab"}},
        {"/var /usr/", {"/var /usr"}, {"var usr", "/var"}},
        {R"(a\/b \*\-)", {"*-a/b"}, {R"(a\/b *-)", "a/b -"}},
        // Bytes that are not UTF-8 count as Latin-1 in keywords, and in rows for regexes.
        {"/caf\xe9 .$/", {"caf\xe9 \xff", "CAFÉ x"}, {"cafe x"}},
        {"/\xed\xa0\x80/", {"\xc3\xad\xc2\xa0\xc2\x80"}, {"x"}},
        {std::string("a\0b", 3), {"b a"}, {"a"}},
    };
    for (const auto &[keyword, matching, other] : examples) {
        Texts all = matching;
        all.insert(all.end(), other.begin(), other.end());
        EXPECT_EQ(SearchTable(all).Matching(keyword), matching) << keyword << "\n"
                                                                << GenSQLRegexp(keyword, "msg");
    }
}

TEST(Keyword, GivesTheMatchAllTextExactlyWhenItFiltersNothing) {
    for (const char *keyword : {"*", " * ", "\t*\n", "**", "* *", "", "  "})
        EXPECT_EQ(GenSQLRegexp(keyword, "msg"), "msg GLOB '**'") << '[' << keyword << ']';
    for (const char *keyword : {"-*", "?", "\"*\"", "* a", "\\*"})
        EXPECT_NE(GenSQLRegexp(keyword, "msg"), "msg GLOB '**'") << '[' << keyword << ']';
}

TEST(Keyword, KeepsNullOnlyWhereTermsExclude) {
    const SearchTable table({"a"});
    for (const char *keyword : {"-x", "-*", "-\"[\"", "-/x/", "-x -y", "b OR -x"})
        EXPECT_EQ(table.CountWhere("id = 0 AND " + GenSQLRegexp(keyword, "msg")), 1) << keyword;
    for (const char *keyword : {"*", "?", "a", "A", "[", "/a/", "a OR b", "-x a"})
        EXPECT_EQ(table.CountWhere("id = 0 AND " + GenSQLRegexp(keyword, "msg")), 0) << keyword;
    EXPECT_EQ(table.CountWhere("NOT " + GenSQLRegexp("b OR -a", "msg")), 1); // one operand
}

TEST(Keyword, ReportsABrokenRegexOnceAndMatchesNothingByIt) {
    const SearchTable table({"[b", "(", "a"});
    SyslogCapture log;
    EXPECT_THAT(table.Matching("/[b\x1b%s/"), IsEmpty());
    EXPECT_THAT(log.Take(), ElementsAre(SyslogMessage{
                                LOG_ERR, "Broken regular expression [[b\\x1b%s] in a search keyword "
                                         "matches nothing: missing ]: [b\\x1b%s"}));
    EXPECT_THAT(table.Matching("-/(/"), IsEmpty()); // a slip must not make a deletion larger
    EXPECT_THAT(table.Matching("a OR /(/ /)/ OR /(/ OR a"), ElementsAre("a"));
    EXPECT_EQ(log.Take().size(), 3U);
    EXPECT_THAT(table.Matching("/" + std::string(200000, '(') + "/"), IsEmpty());
    EXPECT_LT(log.Take().at(0).second.size(), 600U);
}

TEST(Keyword, ErrorIsTheFirstLineThatTheSystemLogGets) {
    for (const std::string &keyword : {std::string(), std::string("/a/ -\"(\""), std::string("/]a/ /[a/"),
                                       std::string("a\0/(/", 5), "-/" + std::string(1000, '(') + "/ /)/"}) {
        SyslogCapture log;
        GenSQLRegexp(keyword, "msg");
        const std::vector<std::string> lines = log.TakeTexts();
        EXPECT_EQ(KELOKeywordError(keyword), lines.empty() ? "" : lines.front()) << keyword;
        EXPECT_THAT(log.TakeTexts(), IsEmpty());
    }
}

std::string Repeated(const std::string &text, int count) {
    std::string repeated;
    for (int i = 0; i < count; ++i)
        repeated += text;
    return repeated;
}

TEST(Keyword, StaysWithinSqlitesLimitsWhateverItsSize) {
    const std::string letters = Repeated("abcdefghij", 4'100);
    const Texts texts = {letters, "a'%_[\\"};
    const Texts first = {letters};
    const std::vector<std::pair<std::string, Texts>> examples = {
        {Repeated("a*j", 1'100), first}, // more stars than GLOB and LIKE are asked for
        {Repeated("?", 10'000), first},   {Repeated("x OR ", 20'000) + "T", {}},
        {Repeated("-y ", 3'000), texts},  {Repeated("/c/ ", 500), first},
        {Repeated("'%_[\\", 20'000), {}},
    };
    const SearchTable table(texts);
    SyslogCapture log;
    for (const auto &[keyword, matching] : examples)
        EXPECT_TRUE(table.Matching(keyword) == matching) << keyword.substr(0, 40);
    EXPECT_THAT(log.Take(), IsEmpty());
}

TEST(SearchFunctions, AnswerAsDocumentedWhenCalledFromSql) {
    const SearchTable table({"abc", "ABC"});
    EXPECT_EQ(table.CountWhere("msg REGEXP '^a.c$'"), 1);
    EXPECT_EQ(table.CountWhere("regexpi(substr('abd', 1, id + 1), msg)"), 1); // no constant: compiled per row
    EXPECT_EQ(table.CountWhere("regexp(NULL, msg) IS NULL"), 3);
    EXPECT_EQ(table.CountWhere("regexp('b', 'a' || char(0) || 'b')"), 0); // as GLOB and LIKE see the text
    EXPECT_THAT(Execute(table.Database(), "SELECT regexp('[', 'x')").error, HasSubstr("/[/: missing ]"));
    Execute(table.Database(), "CREATE VIEW v AS SELECT * FROM logs WHERE regexp('a', msg)");
    EXPECT_EQ(Execute(table.Database(), "SELECT * FROM v").status, -1); // no damaged or foreign file can
}

} // namespace
} // namespace kelo::test
