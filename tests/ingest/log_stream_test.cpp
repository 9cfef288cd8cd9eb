#include <gtest/gtest.h>

#include "kelosyslog/logparser.h"
#include "support/syslog_capture.h"

namespace {

std::string Messages(LogParser &parser) {
    std::string messages;
    for (const _SYSLOG_LOG_DATA_tag &log : parser.LogListGet())
        messages += log.fac + "|" + log.msg + "\n";
    return messages;
}

} // namespace

TEST(LogStream, GivesTheSameRecordsHoweverTheTextIsCut) {
    const std::string entry = "f info d t 1 2 z h i p t";
    const std::string text = "\n\n" + entry + " a \r\n  " + entry + "\ntoo short\n \n" + entry +
                             std::string(" \0\xff\n\n", 5) + entry + " end";
    LogParser whole;
    std::string copy = text;
    whole.LogAdd(copy);
    ASSERT_EQ(whole.LogGetCount(), 4);
    for (size_t length = 1; length < text.size(); ++length) {
        LogParser parser;
        LogStream stream(parser);
        for (size_t at = 0; at < text.size(); at += length)
            stream.Add(std::string_view(text).substr(at, length));
        stream.Finish();
        ASSERT_EQ(Messages(parser), Messages(whole)) << length;
    }
}

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
