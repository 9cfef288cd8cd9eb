#include "kelosyslog/logparser.h"
#include "support/test.h"

using namespace kelo::test;

namespace {

const std::string kEleven = "local0 info 2020/01/02 10:11:12 100 200 +08:00 nas 127.0.0.1 prog tag";

// The fields of a record in the order of a line, which is what it was parsed from.
std::string Line(const _SYSLOG_LOG_DATA_tag &log) {
    const std::string numbers = std::to_string(log.utcsec) + " " + std::to_string(log.extnum);
    return log.fac + " " + PriorTypeToStr(log.prio) + " " + log.ldate + " " + log.ltime + " " + numbers +
           " " + log.tzoffset + " " + log.host + " " + log.ip + " " + log.prog + " " + log.tag + " " +
           log.msg;
}

} // namespace

TEST(ParseSingleEntry, TakesElevenFieldsAndTheMessageVerbatim) {
    const std::pair<std::string, std::string> kCases[] = {
        {kEleven + " two  words", "two  words"},
        {"   local0 info 2020/01/02    10:11:12 100 200 +08:00 nas 127.0.0.1 prog tag two words",
         "two words"},
        {kEleven, ""},
        {kEleven + " ", ""},
        {kEleven + "   kept", "  kept"},
        {kEleven + std::string(" a\0b \t\r", 7), std::string("a\0b \t\r", 6)},
        {kEleven + " " + std::string(10'000'000, 'x'), std::string(10'000'000, 'x')},
    };
    for (const auto &[line, msg] : kCases) {
        _SYSLOG_LOG_DATA_tag log;
        EXPECT_EQ(LogParser().ParseSingleEntry(line, log), 0);
        EXPECT_TRUE(Line(log) == kEleven + " " + msg) << line.substr(0, 100);
    }
}

TEST(ParseSingleEntry, ReadsNumbersAsStrtollAndUnknownPrioritiesAsDebug) {
    const std::vector<std::pair<std::string, int64_t>> kNumbers = {{"12abc", 12},
                                                                   {"-5", -5},
                                                                   {"+5", 5},
                                                                   {"+-5", 0},
                                                                   {"-", 0},
                                                                   {"\t7", 7},
                                                                   {"0x10", 0},
                                                                   {"\xb2", 0},
                                                                   {"9223372036854775808", INT64_MAX},
                                                                   {"-9223372036854775809", INT64_MIN}};
    for (const auto &[text, number] : kNumbers) {
        _SYSLOG_LOG_DATA_tag log;
        // The other number follows: what is read of one must not reach into it.
        ASSERT_EQ(LogParser().ParseSingleEntry("f p d t " + text + " 44 z h i p t m", log), 0);
        EXPECT_EQ(log.utcsec, number) << text;
        EXPECT_EQ(log.extnum, 44) << text;
    }
    const std::map<std::string, int> words = {{"emerg", 0}, {"err", 3}, {"ERR", 7}, {"error", 7}, {"6", 7}};
    for (const auto &[word, prio] : words) {
        _SYSLOG_LOG_DATA_tag log;
        ASSERT_EQ(LogParser().ParseSingleEntry("f " + word + " d t 1 2 z h i p t m", log), 0);
        EXPECT_EQ(log.prio, prio) << word;
    }
}

TEST(ParseSingleEntry, KeepsTheFieldsTakenWhenTheLineEndsEarly) {
    _SYSLOG_LOG_DATA_tag log;
    log.extnum = 200;
    log.msg = "before";
    EXPECT_EQ(LogParser().ParseSingleEntry("user err day clock 7  ", log), -1);
    EXPECT_EQ(Line(log), "user err day clock 7 200      before");
    for (const std::string &line : {std::string(), std::string("   "), kEleven.substr(0, kEleven.size() - 4)})
        EXPECT_EQ(LogParser().ParseSingleEntry(line, log), -1) << line;
}

TEST(isValidLog, NamesARecordIncompleteWhicheverOfItsFieldsIsEmpty) {
    using Field = std::string _SYSLOG_LOG_DATA_tag::*;
    constexpr Field kFields[] = {&_SYSLOG_LOG_DATA_tag::host,  &_SYSLOG_LOG_DATA_tag::ip,
                                 &_SYSLOG_LOG_DATA_tag::ldate, &_SYSLOG_LOG_DATA_tag::ltime,
                                 &_SYSLOG_LOG_DATA_tag::prog,  &_SYSLOG_LOG_DATA_tag::msg};
    SyslogCapture log;
    LogParser parser;
    _SYSLOG_LOG_DATA_tag record;
    for (const Field field : kFields)
        record.*field = "set";
    EXPECT_EQ(LogParser().isValidLog(record), 1) << "the other fields do not matter";
    for (const Field field : kFields) {
        _SYSLOG_LOG_DATA_tag bare = record;
        (bare.*field).clear();
        EXPECT_EQ(parser.isValidLog(bare), 0);
    }
    EXPECT_EQ(parser.RejectedClear(), 6U);
    EXPECT_EQ(parser.RejectedClear(), 0U);
    EXPECT_EQ(log.TakeTexts(), std::vector<std::string>(6, "Invalid log!!!!!!!!!!!!! (Attention Please)"));
}

TEST(LogStream, DropsOverlongLinesAsAWhole) {
    const std::string entry = "f info d t 1 2 z h i p t ";
    const std::string text = entry + std::string(20, 'a') + "\n" + entry + std::string(21, 'b') + "\n" +
                             entry + "c\n" + entry + std::string(500, 'd');
    for (const size_t cut : {size_t{1}, size_t{44}, size_t{45}, size_t{46}, size_t{90}, text.size()}) {
        SyslogCapture log;
        LogParser parser;
        LogStream stream(parser, entry.size() + 20);
        for (size_t at = 0; at < text.size(); at += cut) {
            stream.Add(std::string_view(text).substr(at, cut));
            // A restart would go on behind the last line feed.
            EXPECT_EQ(stream.TakenBytes(), text.substr(0, at + cut).rfind('\n') + 1);
        }
        stream.Finish();
        EXPECT_EQ(stream.TakenBytes(), text.size());
        EXPECT_EQ(stream.OverlongCount(), 2U) << cut;
        const std::list<_SYSLOG_LOG_DATA_tag> records = parser.LogListGet();
        ASSERT_EQ(records.size(), 2U) << cut;
        EXPECT_EQ(records.front().msg, std::string(20, 'a'));
        EXPECT_EQ(records.back().msg, "c");
        EXPECT_THAT(log.Take(), testing::SizeIs(2));
    }
}
