#include "faults/operations.h"

#include <iterator>

#include "keloplatform/kelodb.h"
#include "keloplatform/root.h"
#include "keloplatform/torvc.h"
#include "kelosyslog/accounting.h"
#include "kelosyslog/dbreader.h"
#include "kelosyslog/dbwriter.h"
#include "kelosyslog/root.h"

namespace kelo::test {

time_t now = 1000;

namespace {

using Lines = std::vector<std::string>;

constexpr int kRows = 40;
const _SYSLOG_SQL_COND_tag kFromHost3{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "host03", {}};

// A database of kRows sample logs, the last two of them still in the write-ahead log, as a busy writer leaves
// it.
void SetUpLogs(Fixture &fixture) {
    fixture.database = fixture.root.File("logs.db");
    CreateLogDatabase(fixture.database);
    InsertSampleLogs(fixture.database, kRows - 2);
    InsertLogsIntoWal(fixture.database, {SampleLog(kRows - 2), SampleLog(kRows - 1)});
}

void SetUpLogsOfHost3(Fixture &fixture) {
    SetUpLogs(fixture);
    fixture.conditions = {kFromHost3};
}

int TakeId(_SYSLOG_LOG_DATA_tag &log, void *context) {
    const FaultPause pause;
    static_cast<Fixture *>(context)->seen.push_back(std::to_string(log.id));
    return 0;
}

int TakeCount(Fixture &fixture, int count) {
    const FaultPause pause;
    if (count >= 0)
        fixture.seen.push_back(std::to_string(count));
    return count;
}

// An operation that delivers values, `withoutValues` when those of its conditions were lost: all of them when
// it says that it is done, otherwise the first ones. Its failures are silent but for a last message
// "`failure`
// (...)" where that is not empty.
Operation Ask(const char *name, std::function<int(Fixture &)> run, Lines whole, Lines withoutValues,
              std::string failure = "") {
    const auto check = [=](const Fixture &fixture, const Outcome &outcome) {
        if (!outcome.MayHaveLostValues() || fixture.seen != withoutValues) {
            Lines expected = whole;
            if (!outcome.IsDone())
                expected.resize(std::min(whole.size(), fixture.seen.size()));
            EXPECT_EQ(fixture.seen, expected);
        }
        if (failure.empty() || outcome.IsDone() || outcome.outOfMemory || outcome.fault == "KELODBFetchRow")
            EXPECT_THAT(outcome.messages, IsEmpty());
        else
            EXPECT_THAT(outcome.messages,
                        ElementsAre(AnyOf("fail to connect database (" + fixture.database + ")",
                                          StartsWith("fail to execute database command (" + failure))));
    };
    return {name, false, SetUpLogs, std::move(run), check};
}

// A deletion, after which `left` rows are left. A failed one has deleted either everything it should or
// nothing, and nothing when the statement never ran.
Operation Delete(const char *name, std::function<void(Fixture &)> setUp, int left) {
    const auto run = [](Fixture &fixture) { return SyslogDBDelete(fixture.database, fixture.conditions); };
    const auto check = [=](const Fixture &fixture, const Outcome &outcome) {
        const int rows = std::stoi(RunSql(fixture.database, "SELECT count(*) FROM logs"));
        const bool neverRan = outcome.outOfMemory || outcome.fault.starts_with("KELODB");
        EXPECT_TRUE((rows == left && (outcome.IsDone() || !neverRan)) || (rows == kRows && !outcome.IsDone()))
            << rows;
        EXPECT_THAT(outcome.messages, IsEmpty());
    };
    return {name, true, std::move(setUp), run, check};
}

int SelectNewest(Fixture &fixture) {
    _SYSLOG_SQL_LIMIT_tag page{10, 5};
    return SyslogDBSelect(fixture.database, fixture.conditions, &page, nullptr, TakeId, &fixture, true);
}

// The second search runs through the statement that the first one has left.
int SelectOnKeptConnection(Fixture &fixture) {
    SyslogDBReader reader(fixture.database);
    const _SYSLOG_SQL_LIMIT_tag page{2, 5};
    for (int search = 0; search < 2; ++search) {
        if (reader.Select(fixture.conditions, &page, nullptr, TakeId, &fixture, true) != 0)
            return -1;
    }
    return 0;
}

int Count(Fixture &fixture) {
    return TakeCount(fixture, SyslogDBSelectCount(fixture.database, fixture.conditions, nullptr, nullptr));
}

int CountByForm(Fixture &fixture) {
    std::list<_SYSLOG_SQL_COND_tag> conditions;
    LogSearchCondListGen("host03,host99", "any", "", "", "\"request 3\" FAILED OR clos?d -absent",
                         "2020/01/01", "0", conditions);
    return TakeCount(fixture, SyslogDBSelectCount(fixture.database, conditions, nullptr, nullptr));
}

int GetHosts(Fixture &fixture) {
    std::list<std::string> hosts;
    _SYSLOG_SQL_LIMIT_tag first{2, 0};
    const int result = SyslogDBAttriValueGet(fixture.database, "host", &first, hosts);
    const FaultPause pause;
    fixture.seen.assign(hosts.begin(), hosts.end());
    return result;
}

const std::vector<_SYSLOG_LOG_DATA_tag> kNewLogs = {SampleLog(kRows), SampleLog(kRows + 1)};
constexpr char kMark[] = "INSERT INTO logs (host) VALUES ('mark')";

// Stores two records, and another row in their transaction.
int StoreRecords(Fixture &fixture) {
    const auto mark = [](DBConnect_tag *connection, void *) {
        return KELODBExecute(connection, kMark, nullptr);
    };
    return SyslogDBWriter(fixture.root.File("logs.db")).Store(kNewLogs.data(), kNewLogs.size(), mark);
}

// All or nothing. A commit whose last steps fail may have been one.
void CheckStored(const Fixture &fixture, const Outcome &outcome, int rowsBefore) {
    const int rows = std::stoi(RunSql(fixture.database, "SELECT count(*) FROM logs"));
    const bool neverRan = outcome.outOfMemory || outcome.fault.starts_with("KELODB");
    EXPECT_TRUE((rows == rowsBefore + 3 && (outcome.IsDone() || !neverRan)) ||
                (rows == rowsBefore && !outcome.IsDone()))
        << rows;
    EXPECT_THAT(outcome.messages, IsEmpty());
}

// The database is missing before. What has its name is complete.
void CheckNewDatabase(const Fixture &fixture, const Outcome &outcome) {
    const std::string path = fixture.root.File("logs.db");
    EXPECT_TRUE(fs::exists(path) || !outcome.IsDone());
    if (fs::exists(path)) {
        EXPECT_EQ(RunSql(path, "SELECT count(*) FROM logs"), outcome.IsDone() ? "3" : "0");
        EXPECT_EQ(RunSql(path, "PRAGMA journal_mode"), "wal");
    }
    for (const auto &file : fs::directory_iterator(fixture.root.Path()))
        EXPECT_TRUE(file.path().string().find(".new-") == std::string::npos) << file;
}

const std::string kOldSection = "[R]\nkey=\"old\"\n";
const std::string kNewSection = "[R]\nkey=\"new\"\n";

void SetUpSection(Fixture &fixture) {
    WriteFile(fixture.root.File("notify.conf"), kOldSection);
    WriteFile(fixture.root.File(".notify.conf.lock"), "");
}

int SetSection(Fixture &fixture) {
    const std::string path = fixture.root.File("notify.conf");
    TORVSZHASH *hash = TORVCSzHashAlloc(1);
    int status = hash != nullptr ? TORVCSzHashSetValue(&hash, "key", "new") : -1;
    if (status >= 0)
        status = TORVCFileSetSection(path.c_str(), "R", "R", hash, "%s=\"%s\"\n");
    TORVCSzHashFree(hash);
    return status;
}

// Only bringing the new name to the disk can fail when the new file is in place.
void CheckSection(const Fixture &fixture, const Outcome &outcome) {
    const std::string content = ReadFile(fixture.root.File("notify.conf"));
    const bool mayBeNew = outcome.IsDone() || outcome.fault == "write" || outcome.fault == "full disk";
    EXPECT_TRUE((mayBeNew && content == kNewSection) || (!outcome.IsDone() && content == kOldSection))
        << content;
}

// SQLite calls a database corrupt that the disk cannot read. It keeps its name where no notification is sent.
void SetUpAccounting(Fixture &fixture) {
    PlatformCalls::answers.notification = -1;
    fixture.database = fixture.root.File("var/log/kelolog/.KELOACCOUNTDB");
    CreateLogDatabase(fixture.database, "accinfo.sql");
}

// Flushes twice what was counted, and once more at the manager's end.
int FlushAccounting(Fixture &fixture) {
    now = 1000;
    AccountingManager accounting;
    for (const char *device : {"a", "a", "b'c", "d"}) {
        now += *device == 'd';
        accounting.LogInc(device);
    }
    const int result = accounting.AccoutingFlush2DB();
    TakeCount(fixture, accounting.AccoutingFlush2DB());
    return result;
}

// What a flush says is in the file is there, once. What a failed one has committed is there twice after the
// next.
void CheckAccounting(const Fixture &fixture, const Outcome &outcome) {
    const std::string rows = "1000 a 1;1001 a 1;1001 b'c 1;", counts = "a 2;b'c 1;d 1";
    const std::string samples = RunSql(
        fixture.database,
        "SELECT group_concat(stamp||' '||device||' '||eps||';', '') FROM (SELECT * FROM eps ORDER BY id)");
    const std::string histogram =
        RunSql(fixture.database,
               "SELECT group_concat(device||' '||count, ';') FROM (SELECT * FROM histogram ORDER BY device)");
    if (outcome.outOfMemory)
        return;
    EXPECT_TRUE(outcome.IsDone() || outcome.messages.size() > 2)
        << "two are of the rules, which are not there";
    if (outcome.IsDone() || !fixture.seen.empty()) {
        EXPECT_EQ(histogram, counts);
        ASSERT_TRUE(samples.ends_with(rows)) << samples;
        EXPECT_TRUE(rows.starts_with(samples.substr(0, samples.size() - rows.size()))) << samples;
        EXPECT_TRUE(!outcome.IsDone() || samples == rows) << samples;
    } else {
        EXPECT_TRUE(histogram.empty() || histogram == counts) << histogram;
    }
}

} // namespace

Fixture::Fixture() {
    PlatformCalls::Start();
    SyslogRootSet(root.Path());
    KELORootSet(root.Path().c_str());
}

const std::vector<Operation> &Operations() {
    static const std::vector<Operation> operations = [] {
        std::vector<Operation> all = {
            Ask("SelectPage", SelectNewest, {"26", "27", "28", "29", "30", "31", "32", "33", "34", "35"}, {},
                "SELECT *, (SELECT max(rowid) FROM logs) totalCount FROM logs"),
            Ask("SelectOnKeptConnection", SelectOnKeptConnection, {"34", "35", "34", "35"}, {},
                "SELECT *, (SELECT max(rowid) FROM logs) totalCount FROM logs"),
            Ask("CountAll", Count, {std::to_string(kRows)}, {}),
            Ask("CountByForm", CountByForm, {"1"}, {"0"}),
            Ask("GetHosts", GetHosts, {"host00", "host01"}, {}),
            Delete("DeleteFiltered", SetUpLogsOfHost3, kRows - 1),
            Delete("DeleteAll", SetUpLogs, 0),
            {"StoreRecords", true, SetUpLogs, StoreRecords,
             [](const Fixture &fixture, const Outcome &outcome) { CheckStored(fixture, outcome, kRows); }},
            {"StoreIntoNewDatabase", true, [](Fixture &) {}, StoreRecords, CheckNewDatabase, false},
            {"SetSection", true, SetUpSection, SetSection, CheckSection},
            {"FlushAccounting", true, SetUpAccounting, FlushAccounting, CheckAccounting},
        };
        std::ranges::move(HandlerOperations(), std::back_inserter(all));
        return all;
    }();
    return operations;
}

} // namespace kelo::test

extern "C" time_t time(time_t *seconds) noexcept {
    if (seconds != nullptr)
        *seconds = kelo::test::now;
    return kelo::test::now;
}
