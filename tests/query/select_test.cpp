#include <stdexcept>

#include "query/query_fixture.h"

namespace kelo::test {
namespace {

const _SYSLOG_SQL_COND_tag kMatchAll{SYSLOG_ATTRI_MSG, SYSLOG_OP_GLOB, "**", {}};
const _SYSLOG_SQL_COND_tag kHost{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "host01", {}};

using SyslogDBSelectTest = QueryTest;

TEST_F(SyslogDBSelectTest, SendsTheStatementOfItsCase) {
    const std::string all = "SELECT * FROM t", ofHost = all + " WHERE (host = 'host01')",
                      page = "SELECT *, (SELECT max(rowid) FROM t) totalCount FROM t WHERE ";
    struct Case {
        Conditions conditions;
        std::optional<_SYSLOG_SQL_LIMIT_tag> limit;
        std::optional<_SYSLOG_SQL_ORDER_tag> order;
        PlatformCall call;
    } cases[] = {
        {{}, {}, {}, {"KELODBExecute", all}},
        {{}, {{0, 7}}, {{1, SYSLOG_ATTRI_XFERIP}}, {"KELODBExecute", all + " ORDER BY ip asc"}},
        {{},
         {{50, 0}},
         {{0, SYSLOG_ATTRI_ID}},
         {"KELODBExecute", page + "( id > totalCount - 50 AND id <= totalCount - 0) ORDER BY id desc"}},
        {{kMatchAll},
         {{UINT64_MAX, 2}},
         {},
         {"KELODBExecute", page + "(msg GLOB '**') AND ( id > totalCount - 1 AND id <= totalCount - 2)"}},
        {{kHost}, {}, {{-1, SYSLOG_ATTRI_ID}}, {"KELODBExecute", ofHost + " ORDER BY id asc"}},
        {{kHost}, {{0, 5}}, {}, {"KELODBSelectLimit", ofHost, 0, 5}},
        {{kHost}, {{0x100000005, 0x200000003}}, {}, {"KELODBSelectLimit", ofHost, 5, 3}},
    };
    for (auto &[conditions, limit, order, call] : cases) {
        EXPECT_EQ(SyslogDBSelectByTable(path_, "t", conditions, limit ? &*limit : nullptr,
                                        order ? &*order : nullptr, nullptr, nullptr, false),
                  -1);
        EXPECT_THAT(log_.Take(),
                    ElementsAre(Pair(LOG_ERR, "fail to execute database command (" + call.text + ")")));
        EXPECT_EQ(PlatformCalls::Recorded().back(), call) << call.text;
        EXPECT_EQ(TakeStatement(), call.text);
    }
}

TEST_F(SyslogDBSelectTest, StopsWhereTheCallbackOrTheConversionEnds) {
    RunSql(path_, "CREATE TABLE other AS SELECT 1 AS id UNION SELECT 2");
    InsertSampleLogs(path_, 5);
    int calls = 0;
    const auto stop = [](_SYSLOG_LOG_DATA_tag &, void *context) {
        return ++*static_cast<int *>(context) == 2 ? 1 : 0;
    };
    EXPECT_EQ(SyslogDBSelect(path_, {}, nullptr, nullptr, stop, &calls, false), 0);
    EXPECT_EQ(SyslogDBSelectByTable(path_, "other", {}, nullptr, nullptr, stop, &calls, false), 0);
    EXPECT_EQ(calls, 2);
    const auto raise = [](_SYSLOG_LOG_DATA_tag &, void *) -> int { throw std::runtime_error("stop"); };
    EXPECT_THROW(SyslogDBSelect(path_, {}, nullptr, nullptr, raise, nullptr, false), std::runtime_error);
}

TEST_F(SyslogDBSelectTest, RejectsAPathBeforeAnythingIsOpened) {
    for (const std::string path : {"", "logs.db", "file:/logs.db"}) {
        std::list<std::string> values;
        std::map<uint64_t, std::string> names;
        EXPECT_EQ(SyslogDBSelect(path, {kHost}, nullptr, nullptr, nullptr, nullptr, false), -1);
        EXPECT_EQ(SyslogDBSelectCount(path, {}, nullptr, nullptr), -1);
        EXPECT_EQ(SyslogDBDelete(path, {}), -1);
        EXPECT_EQ(SyslogDBVersionGet(path), 1);
        EXPECT_EQ(SyslogDBHistTotalGet(path), 0u);
        EXPECT_EQ(SyslogDBHistGetSingle(path, "nas"), 0u);
        EXPECT_THAT(SyslogDBHistGet(path, 0), IsEmpty());
        EXPECT_THAT(SyslogDBEpsGet(path, 0, 1), IsEmpty());
        EXPECT_EQ(SyslogDBAttriValueGet(path, "nothing", nullptr, values), -1);
        EXPECT_EQ(SyslogDBExtkeyLookupByName(path, SYSLOG_EXTKEY_FAC, "kern"), 0u);
        EXPECT_EQ(PlatformCalls::Recorded().size(), 0);
        const auto at = [](int line) {
            return "dbutil:" + std::to_string(line) + " Invalid syslog db path!";
        };
        const std::string version = at(863) + " [" + path + "]";
        EXPECT_THAT(log_.TakeTexts(),
                    ElementsAre(at(472), at(581), at(661), version, at(1061), at(1102), at(1144), at(992),
                                at(705), version, at(897), "dbutil:966 Fail to get foreign key map"));
    }
}

using SyslogDBSelectCountTest = QueryTest;

TEST_F(SyslogDBSelectCountTest, CountsByTheLargestIdWithoutAFilter) {
    EXPECT_EQ(SyslogDBSelectCount(path_, {}, nullptr, nullptr), 0);
    InsertSampleLogs(path_, 60);
    EXPECT_EQ(SyslogDBDelete(path_, {{SYSLOG_ATTRI_ID, SYSLOG_OP_LE, "10", {}}}), 0);
    PlatformCalls::Reset();
    _SYSLOG_SQL_ORDER_tag newest{0, SYSLOG_ATTRI_ID};
    EXPECT_EQ(SyslogDBSelectCount(path_, {kMatchAll}, nullptr, &newest), 60);
    EXPECT_EQ(TakeStatement(), "SELECT max(rowid) FROM logs WHERE (msg GLOB '**') ORDER BY id desc");
    EXPECT_EQ(SyslogDBSelectCount(path_, {kMatchAll, kMatchAll}, nullptr, &newest), 50);
    EXPECT_EQ(TakeStatement(),
              "SELECT COUNT(*) FROM logs WHERE (msg GLOB '**') AND (msg GLOB '**') ORDER BY id desc");
    RunSql(path_, "INSERT INTO logs(id) VALUES(4294967298)");
    EXPECT_EQ(SyslogDBSelectCount(path_, {}, nullptr, nullptr), 2);
}

TEST_F(SyslogDBSelectCountTest, TellsAMissingRowFromSeveral) {
    InsertSampleLogs(path_, 2);
    _SYSLOG_SQL_LIMIT_tag all{0, 0}, second{1, 1};
    EXPECT_EQ(SyslogDBSelectCount(path_, {kHost}, &all, nullptr), 1);
    EXPECT_EQ(SyslogDBSelectCount(path_, {kHost}, &second, nullptr), -1);
    EXPECT_EQ(SyslogDBSelectCountByTable(path_, "logs GROUP BY host", {}, nullptr, nullptr), -2);
    EXPECT_EQ(SyslogDBSelectCountByTable(path_, "nothing", {}, nullptr, nullptr), -1);
    EXPECT_THAT(log_.Take(), IsEmpty());
}

} // namespace
} // namespace kelo::test
