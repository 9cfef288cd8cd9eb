#include "kelosyslog/records.h"

#include <gtest/gtest.h>

TEST(PriorStrToType, GivesDebugForWhatIsNoSeverityWord) {
    EXPECT_EQ(PriorStrToType("warning"), SYSLOG_PRIO_WARNING);
    for (const char *word : {"WARNING", "warn", "", static_cast<const char *>(nullptr)})
        EXPECT_EQ(PriorStrToType(word), SYSLOG_PRIO_DEBUG);
}
