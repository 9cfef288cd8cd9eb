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
    _SYSLOG_LOG_DATA_tag rejected;
    rejected.host = "nas";
    rejected.ldate = "2020/01/02";
    rejected.msg = "two words";
    ASSERT_EQ(parser_.isValidLog(rejected), 0);
    parser_.PartialLogSet("f info d t 1 2 z h i p t");
    log_.Clear();
    for (const int threshold : {0, 2}) {
        Debuger::ThresholdSet(threshold);
        std::string text = " %s one\n";
        parser_.LogReset();
        EXPECT_THAT(log_.Messages(), IsEmpty());
        parser_.LogAdd(text);
        parser_.LogDump();
        parser_.PartialLogDump();
    }
    EXPECT_THAT(log_.Texts(), ElementsAre("Paritial log compensation: f info d t 1 2 z h i p t  %s one\n",
                                          "Log count: 1", "Log countent: %s one", "Partial log count: 1",
                                          "Log countent: nas  2020/01/02   two words"));
    EXPECT_EQ(log_.Messages().front().priority, LOG_DEBUG);
}
