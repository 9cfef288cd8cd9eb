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
    for (const char *name : {"Host", "host ", "", "rowid"})
        EXPECT_EQ(LogAttriType(name), SYSLOG_ATTRI_NONE) << name;
    EXPECT_EQ(LogAttriType(std::string("id\0", 3)), SYSLOG_ATTRI_NONE);
    for (int32_t attr = 0; attr < SYSLOG_ATTRI_XFERIP; ++attr) {
        const auto attribute = static_cast<_SYSLOG_DB_ATTRI_tag>(attr);
        EXPECT_EQ(LogAttriType(LogAttriStrGet(attribute)), attribute);
    }
    EXPECT_STREQ(LogAttriStrGet(SYSLOG_ATTRI_XFERIP), "ip");
}

TEST(XferlogDBPathGet, KnowsTypeNamesOnly) {
    EXPECT_STREQ(XferlogDBPathGet("smbxfer"), "/var/log/kelolog/.SMBXFERDB");
    EXPECT_STREQ(XferlogDBPathGet("tftpxfer"), "/var/log/kelolog/.TFTPXFERDB");
    for (const char *name : {"ftpxferlog", "", "FTPXFER", static_cast<const char *>(nullptr)})
        EXPECT_STREQ(XferlogDBPathGet(name), "");
}
