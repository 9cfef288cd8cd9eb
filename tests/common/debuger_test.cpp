#include "kelosyslog/debuger.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <syslog.h>

#include "support/syslog_capture.h"

using kelo::test::SyslogCapture;
using kelo::test::SyslogMessage;

TEST(Debuger, WritesFailuresAlwaysAndTracesUpToTheThreshold) {
    const SyslogCapture capture;
    Debuger::MSG(1, "not shown");
    Debuger::MSG(0, "100%s of %n");
    Debuger::ThresholdSet(2);
    Debuger::MSG(2, "shown");
    Debuger::MSG(3, "not shown");
    Debuger::ThresholdSet(-1);
    Debuger::MSG(0, "failure");
    Debuger::ThresholdSet(0);
    EXPECT_THAT(capture.Messages(),
                testing::ElementsAre(SyslogMessage{LOG_ERR, "100%s of %n"}, SyslogMessage{LOG_DEBUG, "shown"},
                                     SyslogMessage{LOG_ERR, "failure"}));
}
