// Storing records from the library.

#include "kelosyslog/dbwriter.h"

#include <thread>

#include "keloplatform/kelodb.h"
#include "kelosyslog/dbreader.h"
#include "kelosyslog/failure.h"
#include "support/test.h"

namespace kelo::test {
namespace {

class Writer : public LibraryTest {
protected:
    static int Mark(DBConnect_tag *connection, void *context) {
        const int result = KELODBExecute(connection, "INSERT INTO logs (host) VALUES ('mark')", nullptr);
        return context != nullptr ? *static_cast<int *>(context) : result;
    }
    int Store(SyslogDBWriterCallback alongside = nullptr, void *context = nullptr) {
        return writer_.Store(logs_.data(), logs_.size(), alongside, context);
    }
    std::string Hosts() const {
        return RunSql(path_, "SELECT group_concat(host, ' ') FROM (SELECT host FROM logs ORDER BY id)");
    }

    const std::string path_ = root_.File("logs.db");
    const std::vector<_SYSLOG_LOG_DATA_tag> logs_ = {SampleLog(1), SampleLog(2)};
    SyslogDBWriter writer_{path_, {.busyTimeoutMs = 0}};
};

TEST_F(Writer, StoresAllThatBelongsTogetherOrNothing) {
    EXPECT_EQ(Store(Mark), 0);
    int refusal = 1;
    EXPECT_EQ(Store(Mark, &refusal), -1);
    EXPECT_EQ(SyslogFailureGet()->kind, KELO_FAILURE_OTHER);
    const auto wrong = [](DBConnect_tag *db, void *) { return KELODBExecute(db, "SELECT colour", nullptr); };
    EXPECT_EQ(Store(wrong), -1);
    EXPECT_EQ(SyslogFailureGet()->kind, KELO_FAILURE_COLUMN);
    const auto thrown = [](DBConnect_tag *, void *) -> int { throw std::runtime_error("no"); };
    EXPECT_THROW(Store(thrown), std::runtime_error);
    EXPECT_EQ(Hosts(), "host01 host02 mark");
    EXPECT_EQ(writer_.Store(std::list(logs_.begin(), logs_.end())), 0);
    EXPECT_EQ(Hosts(), "host01 host02 mark host01 host02");
    EXPECT_EQ(RunSql(path_,
                     "SELECT host||ip||fac||prio||llevel||tag||utcsec||tzoffset||ldate||ltime||prog||msg "
                     "FROM logs WHERE id = 2"),
              [](const _SYSLOG_LOG_DATA_tag &log) {
                  const std::string prio = PriorTypeToStr(log.prio);
                  return log.host + log.ip + log.fac + prio + prio + log.tag + std::to_string(log.utcsec) +
                         log.tzoffset + log.ldate + log.ltime + log.prog + log.msg;
              }(logs_[1]));
}

TEST_F(Writer, SaysWhyItStoresNothing) {
    auto loud = logs_;
    loud[1].prio = static_cast<_SYSLOG_DB_PRIORITY_tag>(8);
    EXPECT_EQ(writer_.Store(loud.data(), loud.size()), -1);
    EXPECT_STREQ(SyslogFailureGet()->text, "record 1 has a severity that is none of 0 to 7");
    const std::pair<std::string, KELOFAILUREKIND> paths[] = {{"logs.db", KELO_FAILURE_ARGUMENT},
                                                             {root_.File("no/logs.db"), KELO_FAILURE_MISSING},
                                                             {root_.Path(), KELO_FAILURE_ARGUMENT}};
    for (const auto &[path, kind] : paths) {
        EXPECT_EQ(SyslogDBWriter(path).Store(logs_.data(), logs_.size()), -1);
        EXPECT_EQ(SyslogFailureGet()->kind, kind) << path;
    }
    {
        const DatabaseLock lock(path_, "BEGIN IMMEDIATE");
        EXPECT_EQ(Store(), -1);
        EXPECT_EQ(SyslogFailureGet()->kind, KELO_FAILURE_BUSY);
    }
    EXPECT_EQ(Store(), 0);
    WriteFile(path_ + ".text", std::string(5000, 'x'));
    EXPECT_EQ(SyslogDBWriter(path_ + ".text").Store(logs_.data(), logs_.size()), -1);
    EXPECT_EQ(SyslogFailureGet()->kind, KELO_FAILURE_DAMAGED);
    EXPECT_EQ(Hosts(), "host01 host02");
}

TEST_F(Writer, StoresIntoWhatHasItsPath) {
    EXPECT_EQ(Store(), 0);
    fs::rename(path_, root_.File("aside.db"));
    EXPECT_TRUE(writer_.HasMoved());
    EXPECT_EQ(Store(), 0);
    EXPECT_EQ(Hosts(), "host01 host02");
    EXPECT_EQ(RunSql(root_.File("aside.db"), "SELECT count(*) FROM logs"), "2");
    writer_.Close();
    WriteFile(path_, ""); // as a reader may have made it
    EXPECT_EQ(Store(Mark), 0);
    EXPECT_EQ(Hosts(), "host01 host02 mark");
}

TEST_F(Writer, SharesANewDatabaseWithOtherThreads) {
    std::vector<std::thread> threads;
    for (int i = 0; i < 8; ++i)
        threads.emplace_back([this] {
            SyslogDBWriter writer(path_);
            SyslogDBReader reader(path_);
            for (int batch = 1; batch <= 10; ++batch) {
                EXPECT_EQ(writer.Store(logs_.data(), logs_.size()), 0) << SyslogFailureGet()->text;
                const SyslogDBSnapshot snapshot(reader);
                const int count = reader.SelectCount({}, nullptr, nullptr);
                EXPECT_GE(count, 2 * batch);
                EXPECT_EQ(reader.SelectCount({}, nullptr, nullptr), count);
            }
        });
    for (std::thread &thread : threads)
        thread.join();
    EXPECT_EQ(RunSql(path_, "SELECT count(*) FROM logs"), "160");
}

} // namespace
} // namespace kelo::test
