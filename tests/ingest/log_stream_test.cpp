#include "kelosyslog/logparser.h"
#include "support/test.h"

TEST(LogStream, DropsOverlongLinesAsAWhole) {
    const std::string entry = "f info d t 1 2 z h i p t ";
    const std::string text = entry + std::string(20, 'a') + "\n" + entry + std::string(21, 'b') + "\n" +
                             entry + "c\n" + entry + std::string(500, 'd');
    for (const size_t cut : {size_t{1}, size_t{44}, size_t{45}, size_t{46}, size_t{90}, text.size()}) {
        kelo::test::SyslogCapture log;
        LogParser parser;
        LogStream stream(parser, entry.size() + 20);
        for (size_t at = 0; at < text.size(); at += cut)
            stream.Add(std::string_view(text).substr(at, cut));
        stream.Finish();
        EXPECT_EQ(stream.OverlongCount(), 2U) << cut;
        const std::list<_SYSLOG_LOG_DATA_tag> records = parser.LogListGet();
        ASSERT_EQ(records.size(), 2U) << cut;
        EXPECT_EQ(records.front().msg, std::string(20, 'a'));
        EXPECT_EQ(records.back().msg, "c");
        EXPECT_EQ(log.Texts().size(), 2U);
    }
}
