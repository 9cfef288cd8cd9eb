// Searches with and without the skip index, on a database to which everything happens meanwhile. Each must
// give the same rows in the same order, the same count, and delete the same rows.
//
//     skip_index_oracle [SEARCHES [SEED [DATABASE]]]
//
// With DATABASE: the same with that one, to which others append and from which they delete meanwhile. A
// search is for the records up to the newest one at the time; it is asked for without the index and with it,
// and where the answers differ without it again: records may have been deleted.
//
// Exit status: 0 all the same, 1 a difference, or an index that was reported too often or not at all.

#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>

#include "comparison.h"
#include "keloplatform/skip_index.h"
#include "platform/db_fixture.h"
#include "random_database.h"
#include "support/log_database.h"
#include "support/syslog_capture.h"

namespace kelo::test {
namespace {

constexpr size_t kSearchesPerChange = 10;
constexpr uid_t kNobody = 65534;

class Oracle {
public:
    explicit Oracle(uint64_t seed) : random_(seed), database_(random_) {}
    Oracle(uint64_t seed, const std::string &path)
        : random_(seed), isShared_(true), database_(random_, path) {}

    // Does something every now and then, and searches. Returns what is wrong, "" for nothing.
    std::string Search();
    void Print(size_t searches) const;
    const std::string &LastChange() const { return database_.LastChange(); }

private:
    std::string SearchShared();
    std::string SearchAlone(RandomSearch &search);
    std::string SearchBeside(RandomSearch &search);
    std::string SearchAsNobody(RandomSearch &search);
    std::string Delete(RandomSearch &search);
    std::string CompareValues();

    Random random_;
    const bool isShared_ = false;
    SyslogCapture log_;
    RandomDatabase database_;
    size_t done_ = 0;
    size_t served_ = 0;
    size_t asNobody_ = 0;
    size_t deletions_ = 0;
    size_t values_ = 0;
    size_t changedMeanwhile_ = 0;
    size_t undecided_ = 0;
};

std::string Oracle::Search() {
    if (isShared_)
        return SearchShared();
    if (done_++ % kSearchesPerChange == 0) {
        if (std::string wrong = database_.CheckLines(log_.TakeTexts()); !wrong.empty())
            return "before: " + wrong; // by searches
        database_.Change();
        if (std::string wrong = database_.CheckLines(log_.TakeTexts()); !wrong.empty())
            return wrong;
    }
    RandomSearch search = MakeRandomSearch(random_, [this] { return database_.PartOfMessage(); });
    if (random_.OneIn(100) && !search.conditions.empty())
        return Delete(search);
    if (random_.OneIn(50))
        return CompareValues();
    return random_.OneIn(30) ? SearchAsNobody(search) : SearchAlone(search);
}

// Statements of the test itself fail when somebody replaces the file meanwhile.
std::string Oracle::SearchShared() {
    try {
        if (done_++ % kSearchesPerChange == 0)
            database_.Change();
        RandomSearch search = MakeRandomSearch(random_, [this] { return database_.PartOfMessage(); });
        return SearchBeside(search);
    } catch (const std::runtime_error &) {
        ++undecided_;
        return "";
    }
}

std::string Oracle::SearchAlone(RandomSearch &search) {
    const Answer found = Ask(database_.Path(), search, WithIndex::kYes);
    served_ += WasServed() ? 1 : 0;
    const Answer expected = Ask(database_.Path(), search, WithIndex::kNo);
    return found == expected ? "" : Difference(search, found, expected);
}

// A file that took the place of the database is another one.
std::pair<ino_t, std::string> StateOf(const std::string &path) {
    struct stat file {};
    stat(path.c_str(), &file);
    return {file.st_ino, RunSql(path, "SELECT ifnull(max(seq), 0) FROM sqlite_sequence WHERE name = 'logs'")};
}

std::string Oracle::SearchBeside(RandomSearch &search) {
    const std::string &path = database_.Path();
    const auto state = StateOf(path);
    search.conditions.push_back({SYSLOG_ATTRI_ID, SYSLOG_OP_LE, state.second, {}});
    const Answer before = Ask(path, search, WithIndex::kNo);
    const Answer found = Ask(path, search, WithIndex::kYes);
    served_ += WasServed() ? 1 : 0;
    if (found == before)
        return "";
    const Answer after = Ask(path, search, WithIndex::kNo);
    const auto later = StateOf(path);
    if (later.first != state.first || std::stoll(later.second) < std::stoll(state.second)) {
        ++undecided_;
        return "";
    }
    if (before == after)
        return Difference(search, found, before);
    if (search.limit) {
        ++undecided_;
        return "";
    }
    ++changedMeanwhile_;
    return IsBetween(found, before, after) ? "" : Difference(search, found, before);
}

// A user who may only read, while somebody has the database open.
std::string Oracle::SearchAsNobody(RandomSearch &search) {
    ++asNobody_;
    const TestDatabase user(database_.Path());
    const std::string folder = database_.Path().substr(0, database_.Path().rfind('/'));
    if (geteuid() == 0)
        chmod(folder.c_str(), 0755);
    const pid_t child = fork();
    if (child == 0) {
        if (geteuid() == 0 && seteuid(kNobody) != 0)
            _exit(1);
        const std::string difference = SearchAlone(search);
        std::fputs(difference.c_str(), stderr);
        _exit(difference.empty() ? 0 : 1);
    }
    int status = 0;
    waitpid(child, &status, 0);
    return status == 0 ? "" : "a difference for a user who may only read";
}

// What is left is what does not match.
std::string Oracle::Delete(RandomSearch &search) {
    ++deletions_;
    search.limit.reset();
    search.order = _SYSLOG_SQL_ORDER_tag{1, SYSLOG_ATTRI_ID};
    RandomSearch everything;
    everything.order = search.order;
    const Answer before = Ask(database_.Path(), everything, WithIndex::kNo);
    const Answer matching = Ask(database_.Path(), search, WithIndex::kNo);
    SyslogDBDelete(database_.Path(), search.conditions);
    const Answer left = Ask(database_.Path(), search, WithIndex::kNo);
    const Answer after = Ask(database_.Path(), everything, WithIndex::kNo);
    return left.rows.empty() && after.rows.size() == before.rows.size() - matching.rows.size()
               ? ""
               : "deletion: " + Difference(search, after, before);
}

std::string Oracle::CompareValues() {
    ++values_;
    constexpr const char *kColumns[] = {"host", "prog", "llevel", "ldate"};
    const std::string column = random_.Of(kColumns);
    return ValuesOf(database_.Path(), column, WithIndex::kYes) ==
                   ValuesOf(database_.Path(), column, WithIndex::kNo)
               ? ""
               : "values of " + column;
}

void Oracle::Print(size_t searches) const {
    std::printf("%zu searches gave the same, %zu of them by the index", searches, served_);
    if (isShared_)
        std::printf("; %zu while records were deleted, %zu undecided for that reason", changedMeanwhile_,
                    undecided_);
    else
        std::printf("; %zu deletions, %zu lists of values, %zu by a user who may only read; %zu lines in the "
                    "system log",
                    deletions_, values_, asNobody_, database_.Lines());
    std::puts("\nafter:");
    for (const auto &[name, count] : database_.Changes())
        std::printf("  %5zu %s\n", count, name.c_str());
}

int Run(Oracle &oracle, size_t searches, uint64_t seed) {
    for (size_t done = 0; done < searches; ++done) {
        if (const std::string wrong = oracle.Search(); !wrong.empty()) {
            std::fprintf(stderr, "search %zu of seed %llu, after \"%s\": %s\n", done,
                         static_cast<unsigned long long>(seed), oracle.LastChange().c_str(), wrong.c_str());
            oracle.Print(done);
            return 1;
        }
    }
    oracle.Print(searches);
    return 0;
}

} // namespace
} // namespace kelo::test

int main(int argc, char **argv) {
    using namespace kelo::test;
    const size_t searches = argc > 1 ? std::strtoul(argv[1], nullptr, 10) : 1000;
    const uint64_t seed = argc > 2 ? std::strtoull(argv[2], nullptr, 10) : 1;
    if (argc > 3) {
        Oracle oracle(seed, argv[3]);
        return Run(oracle, searches, seed);
    }
    Oracle oracle(seed);
    return Run(oracle, searches, seed);
}
