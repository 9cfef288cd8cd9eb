#include "kelosyslog/records.h"

#include <gtest/gtest.h>

#include <set>

TEST(PriorStrToType, GivesDebugForWhatIsNoSeverityWord) {
    EXPECT_EQ(PriorStrToType("warning"), SYSLOG_PRIO_WARNING);
    for (const char *word : {"WARNING", "warn", "", static_cast<const char *>(nullptr)})
        EXPECT_EQ(PriorStrToType(word), SYSLOG_PRIO_DEBUG);
}

TEST(PriorTypeToStr, IsTheInverseOfPriorStrToType) {
    EXPECT_EQ(PriorTypeToStr(SYSLOG_PRIO_ERR), "err");
    for (int32_t prio = 0; prio < 8; ++prio) {
        const auto severity = static_cast<_SYSLOG_DB_PRIORITY_tag>(prio);
        EXPECT_EQ(PriorStrToType(PriorTypeToStr(severity).c_str()), severity);
    }
}

TEST(LogAttriType, FindsTheFirstExactName) {
    EXPECT_EQ(LogAttriType("ip"), SYSLOG_ATTRI_IP);
    for (const char *name : {"Host", "host ", "", "rowid"})
        EXPECT_EQ(LogAttriType(name), SYSLOG_ATTRI_NONE) << name;
    EXPECT_EQ(LogAttriType(std::string("id\0", 3)), SYSLOG_ATTRI_NONE);
    for (int32_t attr = 0; attr < SYSLOG_ATTRI_XFERIP; ++attr) {
        const auto attribute = static_cast<_SYSLOG_DB_ATTRI_tag>(attr);
        EXPECT_EQ(LogAttriType(LogAttriStrGet(attribute)), attribute);
    }
    EXPECT_STREQ(LogAttriStrGet(SYSLOG_ATTRI_XFERIP), "ip");
}

TEST(TrimUserName, DropsWhatEndsWithTheFirstColon) {
    EXPECT_EQ(TrimUserName("admin: logged in"), " logged in");
    EXPECT_EQ(TrimUserName("a:b:c"), "b:c");
    EXPECT_EQ(TrimUserName("no user"), "no user");
    EXPECT_EQ(TrimUserName("admin:"), "");
}

TEST(XferlogDBPathGet, KnowsTypeNamesOnly) {
    EXPECT_STREQ(XferlogDBPathGet("smbxfer"), "/var/log/kelolog/.SMBXFERDB");
    EXPECT_STREQ(XferlogDBPathGet("tftpxfer"), "/var/log/kelolog/.TFTPXFERDB");
    for (const char *name : {"ftpxferlog", "", "FTPXFER", static_cast<const char *>(nullptr)})
        EXPECT_STREQ(XferlogDBPathGet(name), "");
}

TEST(Vocabulary, TablesEndAsTheirReadersExpect) {
    EXPECT_EQ(g_MappingSyslogOP[SYSLOG_OP_RAW], nullptr);
    EXPECT_STREQ(g_MappingSyslogOP[SYSLOG_OP_NOT_GLOB], "NOT GLOB");
    ASSERT_EQ(g_xferlog_info_count, 7);
    EXPECT_EQ(g_xferlog_info[6].name, nullptr);
    EXPECT_EQ(g_xferlog_info[6].type, 0);
    std::set<int32_t> types;
    for (int32_t i = 0; i < g_xferlog_info_count - 1; ++i)
        types.insert(g_xferlog_info[i].type);
    EXPECT_EQ(types, (std::set<int32_t>{1, 3, 4, 5, 6, 7}));
}
