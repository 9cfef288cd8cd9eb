#include "faults/operations.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>

#include "kelosyslog/dbhandler.h"
#include "kelosyslog/logger.h"
#include "support/fault_pause.h"
#include "support/log_database.h"

namespace kelo::test {
namespace {

using testing::AnyOf;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StartsWith;

using Lines = std::vector<std::string>;

constexpr int kRows = 40;
const _SYSLOG_SQL_COND_tag kFromHost3{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "host03", {}};
const std::string kIdsLeft = "SELECT group_concat(id) FROM (SELECT id FROM logs ORDER BY id)";

std::string Ids(int first, int last, int without = 0) {
    std::string ids;
    for (int id = first; id <= last; ++id) {
        if (id != without)
            ids += (ids.empty() ? "" : ",") + std::to_string(id);
    }
    return ids;
}

Lines IdLines(int first, int last) {
    Lines lines;
    for (int id = first; id <= last; ++id)
        lines.push_back(std::to_string(id));
    return lines;
}

// A database of kRows sample logs, the last ten of them still in the write-ahead log, as a busy writer leaves
// it.
void SetUpLogs(Ground &ground) {
    ground.database = ground.root.File("logs.db");
    CreateLogDatabase(ground.database);
    InsertSampleLogs(ground.database, kRows - 10);
    std::vector<_SYSLOG_LOG_DATA_tag> newest;
    for (int number = kRows - 10; number < kRows; ++number)
        newest.push_back(SampleLog(number));
    InsertLogsIntoWal(ground.database, newest);
}

void SetUpLogsOfHost3(Ground &ground) {
    SetUpLogs(ground);
    ground.conditions = {kFromHost3};
}

int TakeId(_SYSLOG_LOG_DATA_tag &log, void *context) {
    const FaultPause pause;
    static_cast<Ground *>(context)->seen.push_back(std::to_string(log.id));
    return 0;
}

int TakeCount(Ground &ground, int count) {
    const FaultPause pause;
    if (count >= 0)
        ground.seen.push_back(std::to_string(count));
    return count;
}

// A search that reports itself done has delivered exactly its rows, a failed one no other rows.
void CheckSeen(const Ground &ground, const Outcome &outcome, const Lines &whole, const Lines &withoutValues) {
    if (outcome.MayHaveLostValues() && ground.seen == withoutValues)
        return;
    if (outcome.IsDone())
        EXPECT_EQ(ground.seen, whole);
    else
        EXPECT_TRUE(ground.seen.size() <= whole.size() &&
                    std::equal(ground.seen.begin(), ground.seen.end(), whole.begin()))
            << testing::PrintToString(ground.seen);
}

void CheckSelectMessages(const Ground &ground, const Outcome &outcome, const std::string &statement) {
    const std::string cannotConnect = "fail to connect database (" + ground.database + ")";
    const std::string cannotExecute = "fail to execute database command (";
    if (outcome.IsDone() || outcome.outOfMemory || outcome.fault == "KELODBFetchRow")
        EXPECT_THAT(outcome.messages, IsEmpty());
    else if (outcome.fault == "KELODBConnect")
        EXPECT_THAT(outcome.messages, ElementsAre(cannotConnect));
    else if (outcome.MayHaveLostValues())
        EXPECT_THAT(outcome.messages, ElementsAre(AnyOf(cannotConnect, StartsWith(cannotExecute))));
    else
        EXPECT_THAT(outcome.messages, ElementsAre(AnyOf(cannotConnect, cannotExecute + statement + ")")));
}

// A select: `statement` is the text that its failure names, `whole` the ids that it delivers, `withoutValues`
// those that it delivers when the values of its conditions were lost.
Operation Select(const char *name, std::function<void(Ground &)> setUp, std::function<int(Ground &)> run,
                 std::string statement, Lines whole, Lines withoutValues) {
    const auto check = [=](const Ground &ground, const Outcome &outcome) {
        CheckSeen(ground, outcome, whole, withoutValues);
        CheckSelectMessages(ground, outcome, statement);
    };
    return {name, false, std::move(setUp), std::move(run), check};
}

// An operation that delivers values and whose failures are silent.
Operation Ask(const char *name, std::function<void(Ground &)> setUp, std::function<int(Ground &)> run,
              Lines whole, Lines withoutValues) {
    const auto check = [=](const Ground &ground, const Outcome &outcome) {
        CheckSeen(ground, outcome, whole, withoutValues);
        EXPECT_THAT(outcome.messages, IsEmpty());
    };
    return {name, false, std::move(setUp), std::move(run), check};
}

Operation WithoutAllocationFaults(Operation operation) {
    operation.meetsAllocationFaults = false;
    return operation;
}

// A deletion, after which the ids `left` are left. A failed one has deleted either everything it should or
// nothing, and nothing when the statement never ran.
Operation Delete(const char *name, std::function<void(Ground &)> setUp, std::string left) {
    const auto run = [](Ground &ground) { return SyslogDBDelete(ground.database, ground.conditions); };
    const auto check = [=](const Ground &ground, const Outcome &outcome) {
        const std::string rows = QueryText(ground.database, kIdsLeft);
        const bool nothingDeleted = rows == Ids(1, kRows);
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

// Either map is whole or empty.
void CheckStatistics(const Ground &ground, const Outcome &outcome) {
    const Lines counts = {"a 5", "b 7"};
    const Lines samples = {"100 3", "200 4"};
    if (outcome.IsDone())
        EXPECT_EQ(ground.seen, (Lines{"a 5", "b 7", "100 3", "200 4"}));
    else
        EXPECT_THAT(ground.seen, AnyOf(IsEmpty(), counts, samples));
    EXPECT_THAT(outcome.messages, IsEmpty());
}

// A handler on the database that is disconnected on every path.
class OpenHandler : public DBHandler {
public:
    explicit OpenHandler(const Ground &ground) : DBHandler(ground.database, ground.root.File("no schema")) {}
    ~OpenHandler() { DBDiscon(); }
};

int ReplaceInTransaction(Ground &ground) {
    OpenHandler handler(ground);
    if (handler.DBCon() != 0 || handler.DBTranStart() != 0)
        return -1;
    const bool isReplaced = handler.DBExecute("DELETE FROM logs WHERE id > 5") == 0 &&
                            handler.DBExecute("INSERT INTO logs (host) VALUES ('new')") == 0 &&
                            handler.DBTranEnd() == 0;
    if (isReplaced)
        return 0;
    handler.DBTranRollback();
    return -1;
}

// Everything or nothing is replaced; nothing where no statement of the transaction can have been committed.
void CheckTransaction(const Ground &ground, const Outcome &outcome) {
    const std::string rows = QueryText(ground.database, kIdsLeft);
    const std::string untouched = Ids(1, kRows);
    const std::string replaced = Ids(1, 5) + "," + std::to_string(kRows + 1);
    if (outcome.IsDone())
        EXPECT_EQ(rows, replaced);
    else if (outcome.outOfMemory || outcome.fault.starts_with("KELODB"))
        EXPECT_EQ(rows, untouched);
    else
        EXPECT_THAT(rows, AnyOf(untouched, replaced));
    if (!outcome.outOfMemory) {
        EXPECT_EQ(outcome.messages.empty(), outcome.IsDone());
    }
}

int CountByHandler(Ground &ground) {
    OpenHandler handler(ground);
    return handler.DBCon() == 0 ? TakeCount(ground, static_cast<int>(handler.DBLogCountGet())) : -1;
}

void CheckCountByHandler(const Ground &ground, const Outcome &outcome) {
    CheckSeen(ground, outcome, {std::to_string(kRows)}, {});
    if (!outcome.outOfMemory) {
        EXPECT_EQ(outcome.messages.empty(), outcome.IsDone() || outcome.fault == "KELODBFetchRow");
    }
}

int SelectWith(Ground &ground, _SYSLOG_SQL_LIMIT_tag *limit, _SYSLOG_SQL_ORDER_tag *order) {
    return SyslogDBSelect(ground.database, ground.conditions, limit, order, TakeId, &ground, true);
}

int SelectPage(Ground &ground) {
    _SYSLOG_SQL_LIMIT_tag page{10, 5};
    return SelectWith(ground, &page, nullptr);
}

int SelectSortedPage(Ground &ground) {
    _SYSLOG_SQL_LIMIT_tag page{3, 1};
    _SYSLOG_SQL_ORDER_tag newestFirst{0, SYSLOG_ATTRI_ID};
    return SelectWith(ground, &page, &newestFirst);
}

int SelectAll(Ground &ground) {
    return SelectWith(ground, nullptr, nullptr);
}

int Count(Ground &ground) {
    return TakeCount(ground, SyslogDBSelectCount(ground.database, ground.conditions, nullptr, nullptr));
}

int CountByKeyword(Ground &ground, const char *keyword) {
    std::list<_SYSLOG_SQL_COND_tag> conditions;
    LogSearchCondListGen("host03,host99", "any", "", "", keyword, "2020/01/01", "0", conditions);
    return TakeCount(ground, SyslogDBSelectCount(ground.database, conditions, nullptr, nullptr));
}

int CountByForm(Ground &ground) {
    return CountByKeyword(ground, "\"request 3\" FAILED OR clos?d -absent");
}

int CountByRegex(Ground &ground) {
    return CountByKeyword(ground, "/request 3.*closed/ -/request \\d\\d/");
}

int GetHosts(Ground &ground) {
    std::list<std::string> hosts;
    _SYSLOG_SQL_LIMIT_tag first{2, 0};
    const int result = SyslogDBAttriValueGet(ground.database, "host", &first, hosts);
    const FaultPause pause;
    ground.seen.assign(hosts.begin(), hosts.end());
    return result;
}

// The statistics, which answer with an empty map instead of a failure.
int GetStatistics(Ground &ground) {
    const std::map<std::string, uint64_t> counts = SyslogDBHistGet(ground.database, 2);
    const std::map<int, SYSLOG_LOG_EPS> samples = SyslogDBEpsGet(ground.database, 100, 300);
    const FaultPause pause;
    for (const auto &[device, count] : counts)
        ground.seen.push_back(device + " " + std::to_string(count));
    for (const auto &[stamp, sample] : samples)
        ground.seen.push_back(std::to_string(stamp) + " " + std::to_string(sample.eps));
    return counts.empty() || samples.empty() ? -1 : 0;
}

void SetUpStatistics(Ground &ground) {
    ground.database = ground.root.File("accinfo.db");
    RunSql(ground.database,
           "CREATE TABLE histogram (device TEXT PRIMARY KEY, count INTEGER);"
           "CREATE TABLE eps (stamp INTEGER, eps INTEGER, device TEXT);"
           "INSERT INTO histogram VALUES ('a', 5), ('b', 7), ('c', 1);"
           "INSERT INTO eps VALUES (100, 1, 'a'), (100, 2, 'b'), (200, 4, 'a'), (400, 9, 'a')");
}

void SetUpLogsOfTwoPrograms(Ground &ground) {
    SetUpLogs(ground);
    ground.conditions = {{SYSLOG_ATTRI_PROG, SYSLOG_OP_LIKE, "prog?1", {}},
                         {SYSLOG_ATTRI_MSG, SYSLOG_OP_GLOB, "*closed*", {}}};
}

// The server's event log: `rows` events, the last two of which have lost their time.
template <int Rows>
void SetUpEvents(Ground &ground) {
    ground.database = ground.root.File("events.db");
    const std::string rows = std::to_string(Rows);
    RunSql(ground.database, "PRAGMA journal_mode=WAL; PRAGMA synchronous=OFF;" +
                                ReadFile(KELO_SOURCE_DIR "/package/schema/kelosyslog.sql") +
                                "WITH n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < " + rows +
                                ") INSERT INTO log SELECT i, 1, iif(i > " + rows +
                                " - 2, 0, i), 'u', 'e' FROM n");
}

constexpr int kFewEvents = 3;
constexpr int kFullOfEvents = 20000;
const std::string kEventsLeft = "SELECT count(*) FROM log";

// The event is in unless its transaction could not be ended, which is told.
void CheckEventAdded(const Ground &ground, const Outcome &outcome) {
    const std::string added = std::to_string(kFewEvents + 1);
    const std::string rows = QueryText(ground.database, kEventsLeft);
    const bool lostAtEnd = testing::Matches(testing::Contains("Fail to end transaction"))(outcome.messages);
    if (outcome.IsDone() && !lostAtEnd)
        EXPECT_EQ(rows, added);
    else if (!outcome.IsDone() && !outcome.outOfMemory)
        EXPECT_EQ(rows, std::to_string(kFewEvents));
    else
        EXPECT_THAT(rows, AnyOf(added, std::to_string(kFewEvents)));
    if (!outcome.outOfMemory && !outcome.IsDone()) {
        EXPECT_FALSE(outcome.messages.empty());
    }
}

// Events with a time stay, those without go together.
void CheckRotation(const Ground &ground, const Outcome &outcome) {
    const std::string tidy = std::to_string(kFullOfEvents - 2);
    EXPECT_THAT(QueryText(ground.database, kEventsLeft), AnyOf(tidy, std::to_string(kFullOfEvents)));
    if (outcome.fault.empty()) {
        EXPECT_EQ(QueryText(ground.database, kEventsLeft), tidy);
    }
    if (!outcome.outOfMemory && !outcome.IsDone()) {
        EXPECT_FALSE(outcome.messages.empty());
    }
}

int EnumerateEvents(Ground &ground) {
    const std::list<_SSYSLOG_LOG_LOG_tag> events = Logger().LogEnum(ground.database, 0, kFewEvents);
    const FaultPause pause;
    for (const _SSYSLOG_LOG_LOG_tag &event : events)
        ground.seen.push_back(std::to_string(event.id));
    return events.empty() ? -1 : 0;
}

// All events or none, but for those before a row that could not be fetched; and a failure is told.
void CheckEvents(const Ground &ground, const Outcome &outcome) {
    const bool isCut = outcome.fault == "KELODBFetchRow";
    if (outcome.IsDone() && !isCut) {
        EXPECT_EQ(ground.seen, (Lines{"1", "3", "2"}));
    }
    if (!outcome.outOfMemory) {
        EXPECT_EQ(outcome.messages.empty(), outcome.IsDone() || isCut);
    }
}

int CountEvents(Ground &ground) {
    return TakeCount(ground, Logger().LogCount(ground.database));
}

void CheckEventCount(const Ground &ground, const Outcome &outcome) {
    if (outcome.IsDone()) {
        EXPECT_EQ(ground.seen, Lines{std::to_string(kFewEvents)});
    }
    if (!outcome.outOfMemory) {
        EXPECT_EQ(outcome.messages.empty(), outcome.IsDone());
    }
}

} // namespace

const std::vector<Operation> &Operations() {
    static const std::vector<Operation> operations = {
        Select("SelectPage", SetUpLogs, SelectPage,
               "SELECT *, (SELECT max(rowid) FROM logs) totalCount FROM logs WHERE ( id > totalCount - 15 "
               "AND id <= "
               "totalCount - 5)",
               IdLines(26, 35), {}),
        Select("SelectFilteredPage", SetUpLogsOfTwoPrograms, SelectSortedPage,
               "SELECT * FROM logs WHERE (prog LIKE 'prog_1' escape '\\') AND (msg GLOB '*closed*') ORDER BY "
               "id desc",
               {"22", "12", "2"}, {}),
        Select("SelectAll", SetUpLogs, SelectAll, "SELECT * FROM logs", IdLines(1, kRows), {}),
        Ask("CountAll", SetUpLogs, Count, {std::to_string(kRows)}, {}),
        Ask("CountFiltered", SetUpLogsOfHost3, Count, {"1"}, {"0"}),
        Ask("CountByForm", SetUpLogs, CountByForm, {"1"}, {"0"}),
        WithoutAllocationFaults(Ask("CountByRegex", SetUpLogs, CountByRegex, {"1"}, {"0"})),
        Ask("GetHosts", SetUpLogs, GetHosts, {"host00", "host01"}, {}),
        {"GetStatistics", false, SetUpStatistics, GetStatistics, CheckStatistics},
        {"CountByHandler", false, SetUpLogs, CountByHandler, CheckCountByHandler},
        {"ReplaceInTransaction", true, SetUpLogs, ReplaceInTransaction, CheckTransaction},
        {"AddEvent", true, SetUpEvents<kFewEvents>,
         [](Ground &ground) { return Logger().LogAdd(ground.database, 1, "o'", "e"); }, CheckEventAdded},
        WithoutAllocationFaults({"RotateEvents", true, SetUpEvents<kFullOfEvents>,
                                 [](Ground &ground) { return Logger().LogRotation(ground.database); },
                                 CheckRotation}),
        {"EnumerateEvents", false, SetUpEvents<kFewEvents>, EnumerateEvents, CheckEvents},
        {"CountEvents", false, SetUpEvents<kFewEvents>, CountEvents, CheckEventCount},
        Delete("DeleteFiltered", SetUpLogsOfHost3, Ids(1, kRows, 4)),
        Delete("DeleteAll", SetUpLogs, ""),
    };
    return operations;
}

} // namespace kelo::test
