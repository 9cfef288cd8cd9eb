#include "kelosyslog/debuger.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <syslog.h>

#include "support/syslog_capture.h"

namespace {

using kelo::test::SyslogCapture;
using kelo::test::SyslogMessage;
using testing::ElementsAre;
using testing::IsEmpty;

TEST(Debuger, WritesFailuresAndDropsTraces) {
    const SyslogCapture capture;
    for (const int32_t level : {INT32_MAX, 2, 1})
        Debuger::MSG(level, "trace");
    EXPECT_THAT(capture.Messages(), IsEmpty());
    Debuger::MSG(0, "100%s of %n");
    Debuger::MSG(INT32_MIN, "worse");
    EXPECT_THAT(capture.Messages(),
                ElementsAre(SyslogMessage{LOG_ERR, "100%s of %n"}, SyslogMessage{LOG_ERR, "worse"}));
}

TEST(Debuger, WritesTracesUpToTheThresholdWhereAskedFor) {
    const SyslogCapture capture;
    Debuger::ThresholdSet(2);
    Debuger::MSG(2, "shown");
    Debuger::MSG(3, "not shown");
    Debuger::ThresholdSet(-1);
    Debuger::MSG(1, "not shown");
    Debuger::MSG(0, "failure");
    Debuger::ThresholdSet(0);
    EXPECT_THAT(capture.Messages(),
                ElementsAre(SyslogMessage{LOG_DEBUG, "shown"}, SyslogMessage{LOG_ERR, "failure"}));
}

} // namespace
