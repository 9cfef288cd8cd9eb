#include "kelosyslog/records.h"

#include <gtest/gtest.h>

TEST(Severity, WordsAndNumbersAreInverseAndOtherWordsMeanDebug) {
    EXPECT_EQ(PriorTypeToStr(SYSLOG_PRIO_ERR), "err");
    for (const auto prio : {SYSLOG_PRIO_EMERG, SYSLOG_PRIO_WARNING, SYSLOG_PRIO_DEBUG})
        EXPECT_EQ(PriorStrToType(PriorTypeToStr(prio).c_str()), prio);
    for (const char *word : {"WARNING", "warn", "", static_cast<const char *>(nullptr)})
        EXPECT_EQ(PriorStrToType(word), SYSLOG_PRIO_DEBUG);
}

TEST(LogAttriType, FindsTheFirstExactName) {
    for (const std::string &name : {std::string("Host"), std::string("rowid"), std::string("id\0", 3)})
        EXPECT_EQ(LogAttriType(name), SYSLOG_ATTRI_NONE) << name;
    EXPECT_EQ(LogAttriType("ip"), SYSLOG_ATTRI_IP);
    EXPECT_STREQ(LogAttriStrGet(SYSLOG_ATTRI_XFERIP), "ip");
}

TEST(XferlogDBPathGet, KnowsTypeNamesOnly) {
    EXPECT_STREQ(XferlogDBPathGet("smbxfer"), "/var/log/kelolog/.SMBXFERDB");
    for (const char *name : {"ftpxferlog", "", "FTPXFER", static_cast<const char *>(nullptr)})
        EXPECT_STREQ(XferlogDBPathGet(name), "");
}
