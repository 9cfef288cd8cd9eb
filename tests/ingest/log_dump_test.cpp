#include <gmock/gmock.h>
#include <syslog.h>

#include "kelosyslog/debuger.h"
#include "kelosyslog/logparser.h"
#include "support/syslog_capture.h"

using kelo::test::SyslogCapture;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

class LogDumpTest : public testing::Test {
protected:
    ~LogDumpTest() override { Debuger::ThresholdSet(0); }
    LogParser parser_;
    SyslogCapture log_;
};

} // namespace

TEST_F(LogDumpTest, IsSilentUntilTheThresholdAsksForIt) {
    parser_.PartialLogSet("f info d t 1 2 z h i p t");
    std::string text = " %s one\n";
    parser_.LogAdd(text);
    parser_.LogDump();
    parser_.PartialLogDump();
    EXPECT_THAT(log_.Messages(), IsEmpty());

    Debuger::ThresholdSet(2);
    text = " two";
    parser_.LogAdd(text);
    parser_.LogDump();
    parser_.PartialLogDump();
    EXPECT_THAT(log_.Texts(),
                ElementsAre("Paritial log compensation: f info d t 1 2 z h i p t  two", "Log count: 2",
                            "Log countent: %s one", "Log countent: two", "Partial log count: 0"));
    EXPECT_EQ(log_.Messages().front().priority, LOG_DEBUG);
    EXPECT_EQ(parser_.LogGetCount(), 2);
}

TEST_F(LogDumpTest, ShowsTheSixFieldsOfRejectedRecordsAlsoAfterAReset) {
    _SYSLOG_LOG_DATA_tag record;
    record.host = "nas";
    record.ldate = "2020/01/02";
    record.msg = "two words";
    ASSERT_EQ(parser_.isValidLog(record), 0);
    parser_.LogReset();
    log_.Clear();
    Debuger::ThresholdSet(2);
    parser_.PartialLogDump();
    parser_.LogDump();
    EXPECT_THAT(log_.Texts(), ElementsAre("Partial log count: 1", "Log countent: nas  2020/01/02   two words",
                                          "Log count: 0"));
}
