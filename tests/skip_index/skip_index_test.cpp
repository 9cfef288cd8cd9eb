// The skip index seen from outside: which statements use it, whom it trusts, and what is left after a
// failure.

#include "keloplatform/skip_index.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <sys/file.h>

#include <cstdarg>
#include <functional>
#include <utility>

#include "platform/db_fixture.h"

namespace {

// The calls that change files, counted down: the last one fails, or is the last thing that the process does.
struct Fault {
    int callsLeft = -1;
    int error = 0; // 0: the process ends, with half of what it was to write
};
Fault fault;
// What somebody else does just before: the next time only.
std::function<void()> beforeSlices;
std::function<void()> beforeNewFile;

bool IsDue() {
    if (fault.callsLeft < 0 || fault.callsLeft-- > 0)
        return false;
    fault.callsLeft = 0; // a full disk stays full
    errno = fault.error;
    return true;
}

bool Fails() {
    const bool isDue = IsDue();
    if (isDue && fault.error == 0)
        _exit(0);
    return isDue;
}

template <typename Function>
Function Real(const char *name) {
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}

} // namespace

extern "C" {
ssize_t pwrite(int fd, const void *bytes, size_t size, off_t offset) {
    static const auto real = Real<ssize_t (*)(int, const void *, size_t, off_t)>("pwrite");
    if (beforeSlices && size > 100'000)
        std::exchange(beforeSlices, nullptr)();
    if (!IsDue())
        return real(fd, bytes, size, offset);
    if (fault.error != 0)
        return -1;
    real(fd, bytes, size / 2, offset);
    _exit(0);
}
int open(const char *path, int flags, ...) {
    static const auto real = Real<int (*)(const char *, int, mode_t)>("open");
    va_list more;
    va_start(more, flags);
    const mode_t mode = (flags & O_CREAT) != 0 ? va_arg(more, mode_t) : 0;
    va_end(more);
    if (beforeNewFile && (flags & O_EXCL) != 0)
        std::exchange(beforeNewFile, nullptr)();
    return real(path, flags, mode);
}
int ftruncate(int fd, off_t size) noexcept {
    static const auto real = Real<int (*)(int, off_t)>("ftruncate");
    return Fails() ? -1 : real(fd, size);
}
int fchmod(int fd, mode_t mode) noexcept {
    static const auto real = Real<int (*)(int, mode_t)>("fchmod");
    return Fails() ? -1 : real(fd, mode);
}
}

namespace kelo::test {
namespace {

constexpr int kRows = 160'000; // a segment and a piece

class SkipIndexTest : public testing::Test {
protected:
    SkipIndexTest() {
        CreateLogDatabase(path_);
        RunSql(
            path_,
            "PRAGMA synchronous=OFF; WITH n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < " +
                std::to_string(kRows) +
                ") INSERT INTO logs(host, llevel, fac, utcsec, ldate, msg) SELECT 'host' || (i % 3), 'info', "
                "'daemon', i, printf('2020/01/%02d', i / 10000), "
                "'request ' || i || iif(i % 20000 = 7, ' Segfault', '') FROM n");
    }
    std::string Count(const std::string &where) const {
        const Outcome outcome =
            Execute(ConnectTo(path_), "SELECT COUNT(*) FROM logs WHERE " + where, {"COUNT(*)"});
        return outcome.status == 0 ? outcome.rows.at(0).at(0).value_or("NULL") : outcome.error;
    }
    int64_t EndId() const {
        KELODBSkipIndex index;
        return KELODBSkipIndexGet(ConnectTo(path_).get(), &index) == 0 ? index.endId : -1;
    }

    TempRoot root_;
    SyslogCapture log_;
    const std::string path_ = root_.File("logs.db");
    const std::string index_ = path_ + "-skip";
};

// A changed message, which the index does not notice, shows whether a statement uses it.
TEST_F(SkipIndexTest, ServesSearchesAndLeavesOtherStatementsAlone) {
    ASSERT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    RunSql(path_, "UPDATE logs SET msg = 'hidden Needle [a] 100%', llevel = 'alert', fac = 'lpr', "
                  "utcsec = 500000, ldate = '2021/01/01' WHERE id = 5000");
    const struct {
        const char *where;
        bool isServed;
    } examples[] = {
        {"(msg GLOB '*Needle*')", true},
        {"(msg LIKE '%needle%')", true},
        {"(msg LIKE '%needle [a] 100\\%%' ESCAPE '\\')", true},
        {"(msg GLOB '*Needle [[]a]*')", true},
        {"(instr(msg, 'Needle') > 0)", true},
        {"msg LIKE '%needle%' AND id >= 1 AND (id <= 9223372036854775807)", true},
        {"((msg LIKE '%needle%') AND host = 'host2')", true},
        {"(msg LIKE '%needle%' OR msg LIKE '%absent%')", true},
        {"(msg LIKE '%needle%' OR host = 'absent')", false},
        {"(llevel = 'alert') AND (1)", true},
        {"(fac = 'lpr' OR llevel = 'crit' OR msg LIKE '%needle%')", true},
        {"host = 'host2' AND fac = 'lpr'", true},
        {"llevel IS 'alert'", false},
        {"(msg LIKE '%need%le%' AND ifnull(NOT msg LIKE '%absent%', 1))", true},
        {"regexpi('needle|absent', msg)", true},
        {"regexp('(Need(le|ing)|x+Absent) ', msg)", true},
        {"regexpi('ne+dle', msg)", false},
        {"regexpi('needle|x', msg)", false},
        {"(msg LIKE '%edl%')", false},
        {"NOT (NOT msg LIKE '%needle%')", false},
        {"msg LIKE '%needle%' IS NOT 0", false},
        {"msg LIKE '%needle%' /* comment */", false},
        {"msg LIKE '%needle%' AND id IN (5000)", false},
        {"msg LIKE '%needle%' AND id BETWEEN 1 AND 160000", false},
        {"msg LIKE '%needlX%' ESCAPE 'X'", false},
        {"(SELECT count(*) FROM logs l WHERE l.msg LIKE '%needle%')", false},
        {"msg LIKE '%needle%' COLLATE NOCASE", false},
    };
    for (const auto &[where, isServed] : examples)
        EXPECT_EQ(Count(where) != Count(std::string(where) + " OR 0"), isServed) << where;
    const struct {
        const char *where;
        bool isServed;
    } pages[] = {
        {"(utcsec > 400000)", true},   {"(ldate = '2021/01/01' OR utcsec >= 400000)", true},
        {"(ldate >= '2021')", false},  {"utcsec + 0 >= 400000", false},
        {"utcsec >= '400000'", false},
    };
    const Connection connection = ConnectTo(path_);
    for (const auto &[where, isServed] : pages) {
        const std::string sql = std::string("SELECT * FROM logs WHERE ") + where + " ORDER BY id DESC";
        EXPECT_EQ(Execute(connection, sql, {}, {{10, 0}}).rows.empty(), isServed) << where;
    }
    Execute(connection,
            "BEGIN"); // an older snapshot may have rows that were deleted before the index saw them
    EXPECT_EQ(Execute(connection, "SELECT * FROM logs WHERE (msg GLOB '*Needle*')").rows.size(), 1U);
}

TEST_F(SkipIndexTest, LeavesTheConnectionItsCacheOfPages) {
    ASSERT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    const Connection connection = ConnectTo(path_);
    Execute(connection, "PRAGMA cache_size=-3000");
    EXPECT_EQ(Execute(connection, "SELECT * FROM logs WHERE (msg GLOB '*Segfault*')").rows.size(), 8U);
    EXPECT_EQ(Execute(connection, "PRAGMA cache_size", {"cache_size"}).rows.at(0).at(0), "-3000");
}

TEST_F(SkipIndexTest, FindsMessagesThatMatchByOtherBytesThanTheKeywords) {
    const struct {
        const char *hex; // of the message
        const char *where;
    } examples[] = {
        {"c5bf656372657431", "regexpi('secret1', msg)"},     // a long s
        {"e284aa656c76696e", "regexpi('kelvin', msg)"},      // the sign of kelvin
        {"ff736372616d626c65", "regexpi('ÿscramble', msg)"}, // Latin-1
        {"6265666f72650061667465726e756c", "(msg LIKE '%before%')"},
        {"6265666f72650061667465726e756c", "(instr(msg, 'afternul') > 0)"},
    };
    for (const auto &[hex, where] : examples)
        RunSql(path_, std::string("INSERT INTO logs(msg) VALUES(CAST(x'") + hex + "' AS TEXT))");
    RunSql(path_, "PRAGMA synchronous=OFF; INSERT INTO logs(msg) SELECT msg FROM logs WHERE id <= 30000");
    ASSERT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    for (const auto &[hex, where] : examples) {
        EXPECT_NE(Count(where), "0") << where;
        EXPECT_EQ(Count(where), Count(std::string(where) + " OR 0")) << where;
    }
}

// One record of a block is the only one of it that fits.
TEST_F(SkipIndexTest, FindsWordsAtEveryPlaceOfAMessageAndValuesAtTheEndsOfBlocks) {
    RunSql(path_, "PRAGMA synchronous=OFF; UPDATE logs SET msg = substr(hex(zeroblob(400)), 1, id / 256) || "
                  "iif(id % 512 = 5, '@NEEDLEAZ[', 'nEEDLEaz`{') WHERE id % 256 = 5; "
                  "UPDATE logs SET llevel = 'crit', fac = 'lpr' WHERE id % 256 IN (31, 32)");
    ASSERT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    for (const char *where : {"msg LIKE '%needleaz%'", "msg GLOB '*nEEDLEaz`{*'", "msg LIKE '%0@needleaz[%'",
                              "llevel = 'crit'", "fac = 'lpr'"})
        EXPECT_EQ(Count(where), Count(std::string(where) + " OR 0")) << where;
}

TEST_F(SkipIndexTest, FindsRecordsThatComeBackFromACopy) {
    fs::copy_file(path_, root_.File("copy"));
    RunSql(path_, "DELETE FROM logs WHERE msg GLOB '*Segfault*'");
    ASSERT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    std::ofstream(path_, std::ios::binary | std::ios::trunc)
        << std::ifstream(root_.File("copy"), std::ios::binary).rdbuf();
    EXPECT_EQ(Count("(msg GLOB '*Segfault*')"), "8");
}

// Ids that an older copy, or an emptied table, brings back; what would show it is deleted.
TEST_F(SkipIndexTest, IsNotUsedWhenItsIdsAreUsedAgain) {
    ASSERT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    RunSql(path_, "PRAGMA synchronous=OFF; CREATE TEMP TABLE old AS SELECT * FROM logs; DELETE FROM logs; "
                  "DELETE FROM sqlite_sequence WHERE name = 'logs'; INSERT INTO logs(llevel, fac, msg) "
                  "SELECT llevel, fac, 'Needle ' || id FROM old; DELETE FROM logs WHERE id % 2 = 1");
    EXPECT_EQ(Count("(msg GLOB '*Needle 20*')"), "556");
    EXPECT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    EXPECT_EQ(Count("(msg GLOB '*Needle 20*')"), "556");
    EXPECT_THAT(log_.TakeTexts(), ElementsAre("skip index " + index_ +
                                              ": it is that of another database; it is removed and built "
                                              "again"));
}

TEST_F(SkipIndexTest, IsUsedUpToTheLargestId) {
    RunSql(path_,
           "UPDATE sqlite_sequence SET seq = 9223372036854755807; INSERT INTO logs(utcsec, msg) SELECT "
           "id, msg FROM logs WHERE id <= 20000; DELETE FROM logs WHERE id <= 160000");
    ASSERT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    EXPECT_EQ(Count("(msg GLOB '*Segfault*')"), "1");
    for (const char *order : {"ASC", "DESC"}) {
        const std::string sql = std::string("SELECT * FROM logs WHERE (utcsec > 19400) ORDER BY id ") + order;
        EXPECT_EQ(Execute(ConnectTo(path_), sql, {}, {{1000, 0}}).rows.size(), 600U);
    }
}

// "logs" is not the table of the file, or has an index in whose order the rows come.
TEST_F(SkipIndexTest, LeavesStatementsAloneThatMeanSomethingElse) {
    ASSERT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    const Connection connection = ConnectTo(path_);
    const auto firstId = [&](const char *sql) {
        const Rows rows = Execute(connection, sql, {"id"}).rows;
        return rows.empty() ? "" : rows[0][0].value_or("NULL");
    };
    const char *const unordered = "SELECT * FROM logs WHERE (msg GLOB 'request*Segfault')";
    EXPECT_EQ(firstId(unordered), "7");
    Execute(connection, "CREATE INDEX messages ON logs(msg)");
    EXPECT_EQ(firstId(unordered), "100007");
    Execute(connection, "CREATE TEMP VIEW logs AS SELECT id, 'Segfault' AS msg FROM main.logs WHERE id > 70");
    const char *const counting = "SELECT COUNT(*) FROM logs WHERE (msg GLOB 'Segfault')";
    EXPECT_EQ(Execute(connection, counting, {"COUNT(*)"}).rows,
              (Rows{{std::optional<std::string>("159930")}}));
}

TEST_F(SkipIndexTest, TrustsNoFileThatSomebodyElseMayHavePutThere) {
    ASSERT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    const std::string bytes = ReadFile(index_);
    const auto link = [&](const std::string &target) {
        fs::remove(index_);
        fs::create_symlink(target, index_);
    };
    WriteFile(root_.File("victim"), "untouched");
    const struct {
        const char *name;
        std::function<void()> place;
    } cases[] = {
        {"link", [&] { link(root_.File("victim")); }},
        {"link to an index", [&] { fs::copy_file(index_, root_.File("other")), link(root_.File("other")); }},
        {"link to nothing", [&] { link(root_.File("new")); }},
        {"FIFO", [&] { fs::remove(index_), mkfifo(index_.c_str(), 0600); }},
        {"folder", [&] { fs::remove(index_), fs::create_directory(index_); }},
        {"others may write", [&] { WriteFile(index_, bytes), fs::permissions(index_, fs::perms(0666)); }},
        {"other owner",
         [&] {
             WriteFile(index_, bytes);
             if (chown(index_.c_str(), 12345, 0) != 0)
                 fs::permissions(index_, fs::perms(0666));
         }},
    };
    RunSql(path_, "UPDATE logs SET msg = 'Needle' WHERE id = 5000");
    for (const auto &[name, place] : cases) {
        fs::remove(index_);
        WriteFile(index_, bytes);
        place();
        EXPECT_EQ(Count("(msg GLOB '*Needle*')"), "1") << name;
        EXPECT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_NOT_ALLOWED) << name;
    }
    EXPECT_EQ(ReadFile(root_.File("victim")), "untouched");
    EXPECT_FALSE(fs::exists(root_.File("new")));
    EXPECT_THAT(log_.TakeTexts(), IsEmpty());
}

TEST_F(SkipIndexTest, HasOwnerAndModeOfTheDatabase) {
    fs::permissions(path_, fs::perms(0640));
    const bool isRoot = geteuid() == 0 && chown(path_.c_str(), 12345, 54321) == 0;
    ASSERT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    struct stat index {};
    ASSERT_EQ(stat(index_.c_str(), &index), 0);
    EXPECT_EQ(index.st_mode & 07777, 0640U);
    EXPECT_EQ(index.st_uid, isRoot ? 12345U : geteuid());
    EXPECT_EQ(index.st_gid, isRoot ? 54321U : getegid());
}

TEST_F(SkipIndexTest, IsReplacedWithOneLineWhenItIsDamagedOrAnotherOnes) {
    const struct {
        const char *reason;
        std::function<void(std::string &)> change;
    } cases[] = {
        {"it is damaged", [](std::string &bytes) { bytes[100] ^= 1; }},
        {"it is damaged", [](std::string &bytes) { bytes.resize(bytes.size() - 1); }},
        {"it has another version", [](std::string &bytes) { ++bytes[16]; }},
        {"it is damaged", [](std::string &bytes) { bytes = "text"; }},
    };
    for (const auto &[reason, change] : cases) {
        ASSERT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
        std::string bytes = ReadFile(index_);
        change(bytes);
        WriteFile(index_, bytes);
        EXPECT_EQ(Count("(msg GLOB '*Segfault*')"), "8");
        EXPECT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
        EXPECT_THAT(log_.TakeTexts(),
                    ElementsAre("skip index " + index_ + ": " + reason + "; it is removed and built again"));
        EXPECT_EQ(EndId(), kRows / 16'384 * 16'384);
    }
    std::string bytes = ReadFile(index_);
    for (size_t at = 4096; at < bytes.size(); at += 68) // a bit of every slice, which only reading finds
        bytes[at] ^= 1;
    WriteFile(index_, bytes);
    EXPECT_EQ(Count("(msg GLOB '*Segfault*')"), "8");
    EXPECT_EQ(log_.TakeTexts().size(), 1U);
    EXPECT_FALSE(fs::exists(index_));

    ASSERT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    bytes = ReadFile(index_);
    bytes[bytes.size() - 1000] ^= 1; // in a piece that the next builder reads
    WriteFile(index_, bytes);
    RunSql(path_, "INSERT INTO logs(msg) SELECT msg FROM logs WHERE id <= 20000");
    EXPECT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    EXPECT_EQ(EndId(), (kRows + 20'000) / 16'384 * 16'384);
    EXPECT_EQ(log_.TakeTexts().size(), 1U);
}

TEST_F(SkipIndexTest, IsNotMadeWhereIdsMayComeBack) {
    const std::string rows = "WITH n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 40000) ";
    const std::string insert = rows + "INSERT INTO logs(msg) SELECT 'x' FROM n;";
    for (const std::string &sql :
         {"CREATE TABLE logs(id INTEGER PRIMARY KEY, msg TEXT);" + insert,
          "CREATE TABLE logs(id, msg TEXT);" + insert,
          "CREATE TABLE t(id INTEGER PRIMARY KEY AUTOINCREMENT, msg TEXT); CREATE VIEW logs AS SELECT * FROM "
          "t;" +
              rows + "INSERT INTO t(msg) SELECT 'x' FROM n;",
          "CREATE VIRTUAL TABLE logs USING fts4(id, msg);" + insert,
          "CREATE TABLE logs(id INTEGER PRIMARY KEY AUTOINCREMENT, llevel TEXT COLLATE NOCASE, fac TEXT, "
          "utcsec INTEGER, ldate TEXT, msg TEXT);" +
              insert,
          "PRAGMA encoding='UTF-16';CREATE TABLE logs(id INTEGER PRIMARY KEY AUTOINCREMENT, msg TEXT);" +
              insert}) {
        const std::string path = root_.File("other.db");
        fs::remove(path);
        RunSql(path, sql);
        EXPECT_EQ(KELODBSkipIndexBuild(path.c_str(), 0), KELODB_SKIP_NO_TABLE) << sql;
        EXPECT_FALSE(fs::exists(path + "-skip"));
    }
}

TEST_F(SkipIndexTest, IsBuiltByOneAtATime) {
    ASSERT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    const int other = open(index_.c_str(), O_RDONLY);
    ASSERT_EQ(flock(other, LOCK_EX | LOCK_NB), 0);
    EXPECT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_BUSY);
    close(other);
    EXPECT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    fs::remove(index_);
    beforeNewFile = [&] { WriteFile(index_, ""); };
    EXPECT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_BUSY);
}

TEST_F(SkipIndexTest, IsNotUsedWhenTheContentIsReplacedWhileItIsBuilt) {
    beforeSlices = [&] { RunSql(path_, "UPDATE logs SET msg = 'Needle ' || id"); };
    ASSERT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    EXPECT_EQ(Count("(msg GLOB '*Needle 200*')"), "111");
    EXPECT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE);
    EXPECT_EQ(Count("(msg GLOB '*Needle 200*')"), "111");
}

// Whatever was built before is good, and the next one builds the rest without a word.
TEST_F(SkipIndexTest, SurvivesAKillAndAFullDiskAtEveryWrite) {
    for (const int error : {0, ENOSPC}) {
        for (int call = 0;; ++call) {
            fs::remove(index_);
            const pid_t child = fork();
            if (child == 0) {
                fault = {call, error};
                const int result = KELODBSkipIndexBuild(path_.c_str(), 0);
                _exit(result == KELODB_SKIP_COMPLETE ? 1 : result == KELODB_SKIP_NO_ROOM ? 0 : 2);
            }
            int status = 0;
            waitpid(child, &status, 0);
            if (WEXITSTATUS(status) == 1) {
                EXPECT_GT(call, 4);
                break;
            }
            EXPECT_TRUE(WEXITSTATUS(status) == 0 || call == 0) << call << " " << error;
            EXPECT_EQ(Count("(msg GLOB '*Segfault*')"), "8") << call << " " << error;
            EXPECT_EQ(KELODBSkipIndexBuild(path_.c_str(), 0), KELODB_SKIP_COMPLETE) << call << " " << error;
            EXPECT_EQ(Count("(msg GLOB '*Segfault*')"), "8") << call << " " << error;
            EXPECT_EQ(EndId(), kRows / 16'384 * 16'384);
        }
        // Only half of a head is damage.
        EXPECT_LE(log_.TakeTexts().size(), error == 0 ? 2U : 0U);
    }
}

} // namespace
} // namespace kelo::test
