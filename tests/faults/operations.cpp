#include "faults/operations.h"

#include <iterator>

#include "keloplatform/torvc.h"
#include "support/fault_pause.h"

namespace kelo::test {
namespace {

using Lines = std::vector<std::string>;

constexpr int kRows = 40;
const _SYSLOG_SQL_COND_tag kFromHost3{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "host03", {}};

Lines Ids(int first, int last) {
    Lines ids;
    for (int id = first; id <= last; ++id)
        ids.push_back(std::to_string(id));
    return ids;
}

// A database of kRows sample logs, the last two of them still in the write-ahead log, as a busy writer leaves
// it.
void SetUpLogs(Fixture &ground) {
    ground.database = ground.root.File("logs.db");
    CreateLogDatabase(ground.database);
    InsertSampleLogs(ground.database, kRows - 2);
    InsertLogsIntoWal(ground.database, {SampleLog(kRows - 2), SampleLog(kRows - 1)});
}

void SetUpLogsOfHost3(Fixture &ground) {
    SetUpLogs(ground);
    ground.conditions = {kFromHost3};
}

int TakeId(_SYSLOG_LOG_DATA_tag &log, void *context) {
    const FaultPause pause;
    static_cast<Fixture *>(context)->seen.push_back(std::to_string(log.id));
    return 0;
}

int TakeCount(Fixture &ground, int count) {
    const FaultPause pause;
    if (count >= 0)
        ground.seen.push_back(std::to_string(count));
    return count;
}

// A search that reports itself done has delivered exactly its rows, a failed one no other rows.
void CheckSeen(const Fixture &ground, const Outcome &outcome, const Lines &whole,
               const Lines &withoutValues) {
    if (outcome.MayHaveLostValues() && ground.seen == withoutValues)
        return;
    if (outcome.IsDone())
        EXPECT_EQ(ground.seen, whole);
    else
        EXPECT_TRUE(ground.seen.size() <= whole.size() &&
                    std::equal(ground.seen.begin(), ground.seen.end(), whole.begin()))
            << testing::PrintToString(ground.seen);
}

// An operation that delivers values, `withoutValues` when those of its conditions were lost. Its failures are
// silent but for a last message "`failure` (...)" where that is not empty.
Operation Ask(const char *name, std::function<void(Fixture &)> setUp, std::function<int(Fixture &)> run,
              Lines whole, Lines withoutValues, std::string failure = "") {
    const auto check = [=](const Fixture &ground, const Outcome &outcome) {
        CheckSeen(ground, outcome, whole, withoutValues);
        if (failure.empty() || outcome.IsDone() || outcome.outOfMemory || outcome.fault == "KELODBFetchRow")
            EXPECT_THAT(outcome.messages, IsEmpty());
        else
            EXPECT_THAT(outcome.messages,
                        ElementsAre(AnyOf("fail to connect database (" + ground.database + ")",
                                          StartsWith("fail to execute database command (" + failure))));
    };
    return {name, false, std::move(setUp), std::move(run), check};
}

// A deletion, after which `left` rows are left. A failed one has deleted either everything it should or
// nothing, and nothing when the statement never ran.
Operation Delete(const char *name, std::function<void(Fixture &)> setUp, int left) {
    const auto run = [](Fixture &ground) { return SyslogDBDelete(ground.database, ground.conditions); };
    const auto check = [=](const Fixture &ground, const Outcome &outcome) {
        const int rows = std::stoi(QueryText(ground.database, "SELECT count(*) FROM logs"));
        const bool nothingDeleted = rows == kRows;
        if (outcome.IsDone())
            EXPECT_TRUE(rows == left || (nothingDeleted && outcome.MayHaveLostValues())) << rows;
        else if (outcome.outOfMemory || outcome.fault.starts_with("KELODB"))
            EXPECT_TRUE(nothingDeleted) << rows;
        else
            EXPECT_TRUE(rows == left || nothingDeleted) << rows;
        EXPECT_THAT(outcome.messages, IsEmpty());
    };
    return {name, true, std::move(setUp), run, check};
}

int SelectNewest(Fixture &ground) {
    _SYSLOG_SQL_LIMIT_tag page{10, 5};
    return SyslogDBSelect(ground.database, ground.conditions, &page, nullptr, TakeId, &ground, true);
}

int Count(Fixture &ground) {
    return TakeCount(ground, SyslogDBSelectCount(ground.database, ground.conditions, nullptr, nullptr));
}

int CountByForm(Fixture &ground) {
    std::list<_SYSLOG_SQL_COND_tag> conditions;
    LogSearchCondListGen("host03,host99", "any", "", "", "\"request 3\" FAILED OR clos?d -absent",
                         "2020/01/01", "0", conditions);
    return TakeCount(ground, SyslogDBSelectCount(ground.database, conditions, nullptr, nullptr));
}

int GetHosts(Fixture &ground) {
    std::list<std::string> hosts;
    _SYSLOG_SQL_LIMIT_tag first{2, 0};
    const int result = SyslogDBAttriValueGet(ground.database, "host", &first, hosts);
    const FaultPause pause;
    ground.seen.assign(hosts.begin(), hosts.end());
    return result;
}

const std::string kOldSection = "[R]\nkey=\"old\"\n";
const std::string kNewSection = "[R]\nkey=\"new\"\n";

void SetUpSection(Fixture &ground) {
    WriteFile(ground.root.File("notify.conf"), kOldSection);
}

int SetSection(Fixture &ground) {
    const std::string path = ground.root.File("notify.conf");
    TORVSZHASH *hash = TORVCSzHashAlloc(1);
    int status = TORVCSzHashSetValue(&hash, "key", "new");
    if (status >= 0)
        status = TORVCFileSetSection(path.c_str(), "R", "R", hash, "%s=\"%s\"\n");
    TORVCSzHashFree(hash);
    return status;
}

// Only bringing the new name to the disk can fail when the new file is in place.
void CheckSection(const Fixture &ground, const Outcome &outcome) {
    const std::string content = ReadFile(ground.root.File("notify.conf"));
    const bool mayBeNew = outcome.IsDone() || outcome.fault == "write" || outcome.fault == "full disk";
    EXPECT_TRUE((mayBeNew && content == kNewSection) || (!outcome.IsDone() && content == kOldSection))
        << content;
}

} // namespace

const std::vector<Operation> &Operations() {
    static const std::vector<Operation> operations = [] {
        std::vector<Operation> all = {
            Ask("SelectPage", SetUpLogs, SelectNewest, Ids(26, 35), {},
                "SELECT *, (SELECT max(rowid) FROM logs) totalCount FROM logs"),
            Ask("CountAll", SetUpLogs, Count, {std::to_string(kRows)}, {}),
            Ask("CountByForm", SetUpLogs, CountByForm, {"1"}, {"0"}),
            Ask("GetHosts", SetUpLogs, GetHosts, {"host00", "host01"}, {}),
            Delete("DeleteFiltered", SetUpLogsOfHost3, kRows - 1),
            Delete("DeleteAll", SetUpLogs, 0),
            {"SetSection", true, SetUpSection, SetSection, CheckSection},
        };
        std::ranges::move(HandlerOperations(), std::back_inserter(all));
        return all;
    }();
    return operations;
}

} // namespace kelo::test
