// Searches with and without the skip index, on a database to which everything happens meanwhile. Each must
// give the same rows in the same order, the same count, and delete the same rows.
//
//     skip_index_oracle [SEARCHES [SEED [DATABASE]]]
//
// With DATABASE: searches of that one, to which others may append meanwhile, up to its newest record at the
// time. The index is extended now and then.
//
// Exit status: 0 all the same, 1 a difference.

#include <cstdio>
#include <cstdlib>

#include "keloplatform/skip_index.h"
#include "platform/db_fixture.h"
#include "random_database.h"
#include "random_search.h"
#include "support/log_database.h"
#include "support/syslog_capture.h"

namespace kelo::test {
namespace {

constexpr size_t kSearchesPerChange = 10;

struct Answer {
    int status = 0;
    int count = 0;
    size_t rows = 0;
    std::string texts; // of all rows

    bool operator==(const Answer &) const = default;
};

int Take(_SYSLOG_LOG_DATA_tag &log, void *context) {
    auto &answer = *static_cast<Answer *>(context);
    ++answer.rows;
    answer.texts.append(std::to_string(log.id)).append(" ").append(log.msg).append("\n");
    return 0;
}

class WithoutIndex {
public:
    WithoutIndex() { setenv("KELO_SKIP_INDEX", "off", 1); }
    ~WithoutIndex() { unsetenv("KELO_SKIP_INDEX"); }
};

Answer Ask(const std::string &path, RandomSearch &search) {
    Answer answer;
    _SYSLOG_SQL_LIMIT_tag *limit = search.limit ? &*search.limit : nullptr;
    _SYSLOG_SQL_ORDER_tag *order = search.order ? &*search.order : nullptr;
    answer.status = SyslogDBSelect(path, search.conditions, limit, order, Take, &answer, false);
    if (limit == nullptr)
        answer.count = SyslogDBSelectCount(path, search.conditions, nullptr, order);
    return answer;
}

class Oracle {
public:
    explicit Oracle(uint64_t seed) : random_(seed), database_(random_) {}

    bool Search() {
        RandomSearch search = MakeRandomSearch(random_, [this] { return database_.PartOfMessage(); });
        if (random_.OneIn(100) && !search.conditions.empty())
            return Delete(search);
        const Answer found = Ask(database_.Path(), search);
        const WithoutIndex off;
        const Answer expected = Ask(database_.Path(), search);
        rows_ += expected.rows;
        return found == expected || Differ(search, found, expected);
    }

    void Change() {
        last_ = database_.Change();
        KELODBSkipIndex index;
        indexed_ +=
            KELODBSkipIndexGet(ConnectTo(database_.Path()).get(), &index) == 0 && index.endId > index.firstId;
    }
    size_t Rows() const { return rows_; }
    size_t Indexed() const { return indexed_; }

private:
    // What is left is what does not match.
    bool Delete(RandomSearch &search) {
        search.limit.reset();
        search.order = _SYSLOG_SQL_ORDER_tag{1, SYSLOG_ATTRI_ID};
        RandomSearch everything;
        everything.order = search.order;
        Answer before;
        Answer matching;
        {
            const WithoutIndex off;
            before = Ask(database_.Path(), everything);
            matching = Ask(database_.Path(), search);
        }
        SyslogDBDelete(database_.Path(), search.conditions);
        const WithoutIndex off;
        const Answer left = Ask(database_.Path(), search);
        const Answer after = Ask(database_.Path(), everything);
        return (left.rows == 0 && after.rows == before.rows - matching.rows) || Differ(search, after, before);
    }

    bool Differ(const RandomSearch &search, const Answer &found, const Answer &expected) const {
        std::fprintf(
            stderr, "after \"%s\": %zu rows (%d) instead of %zu (%d) for keyword [%s], conditions:\n",
            last_.c_str(), found.rows, found.count, expected.rows, expected.count, search.keyword.c_str());
        for (const _SYSLOG_SQL_COND_tag &condition : search.conditions)
            std::fprintf(stderr, "  %s %d %s\n", LogAttriStrGet(condition.attr), condition.op,
                         condition.value.c_str());
        if (search.limit)
            std::fprintf(stderr, "  limit %llu offset %llu\n",
                         static_cast<unsigned long long>(search.limit->limit),
                         static_cast<unsigned long long>(search.limit->offset));
        return false;
    }

    Random random_;
    RandomDatabase database_;
    std::string last_;
    size_t rows_ = 0;
    size_t indexed_ = 0;
};

// Nothing if both answers are the same, otherwise what was searched for.
std::string SearchBeside(const std::string &path, Random &random) {
    RandomSearch search = MakeRandomSearch(random, [&] { return RandomPartOfMessage(path, random); });
    search.conditions.push_back(
        {SYSLOG_ATTRI_ID, SYSLOG_OP_LE, RunSql(path, "SELECT ifnull(max(id), 0) FROM logs"), {}});
    const Answer found = Ask(path, search);
    const WithoutIndex off;
    const Answer expected = Ask(path, search);
    std::string clause;
    if (found != expected)
        LogSearchClauseGet(search.conditions, clause);
    return clause;
}

int RunBeside(const std::string &path, size_t searches, uint64_t seed) {
    Random random(seed);
    KELODBSkipIndex index{};
    const std::string first = RunSql(path, "SELECT max(id) FROM logs");
    for (size_t done = 0; done < searches; ++done) {
        if (done % kSearchesPerChange == 0)
            KELODBSkipIndexBuild(path.c_str(), 0);
        if (const std::string difference = SearchBeside(path, random); !difference.empty()) {
            std::fprintf(stderr, "search %zu of seed %llu differs: %s\n", done,
                         static_cast<unsigned long long>(seed), difference.c_str());
            return 1;
        }
    }
    KELODBSkipIndexGet(ConnectTo(path).get(), &index);
    std::printf("%zu searches gave the same; the newest record was %s, then %s; the index ends at %lld\n",
                searches, first.c_str(), RunSql(path, "SELECT max(id) FROM logs").c_str(),
                static_cast<long long>(index.endId));
    return index.endId > 0 ? 0 : 1;
}

int Run(size_t searches, uint64_t seed) {
    SyslogCapture log;
    Oracle oracle(seed);
    for (size_t done = 0; done < searches; ++done) {
        if (done % kSearchesPerChange == 0)
            oracle.Change();
        if (!oracle.Search()) {
            std::fprintf(stderr, "search %zu of seed %llu\n", done, static_cast<unsigned long long>(seed));
            return 1;
        }
    }
    std::printf(
        "%zu searches gave the same %zu rows; the database had an index after %zu of %zu changes, and %zu "
        "were thrown away\n",
        searches, oracle.Rows(), oracle.Indexed(), (searches + 9) / kSearchesPerChange,
        log.TakeTexts().size());
    return 0;
}

} // namespace
} // namespace kelo::test

int main(int argc, char **argv) {
    const size_t searches = argc > 1 ? std::strtoul(argv[1], nullptr, 10) : 1000;
    const uint64_t seed = argc > 2 ? std::strtoull(argv[2], nullptr, 10) : 1;
    return argc > 3 ? kelo::test::RunBeside(argv[3], searches, seed) : kelo::test::Run(searches, seed);
}
