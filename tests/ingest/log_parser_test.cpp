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
    const struct {
        std::string line;
        std::string msg;
    } kCases[] = {
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

TEST(isValidLog, NamesARecordIncompleteOnceWhicheverFieldIsEmpty) {
    using Field = std::string _SYSLOG_LOG_DATA_tag::*;
    LogParser parser;
    SyslogCapture log;
    _SYSLOG_LOG_DATA_tag bare;
    for (const Field field :
         {&_SYSLOG_LOG_DATA_tag::host, &_SYSLOG_LOG_DATA_tag::ip, &_SYSLOG_LOG_DATA_tag::ldate,
          &_SYSLOG_LOG_DATA_tag::ltime, &_SYSLOG_LOG_DATA_tag::prog, &_SYSLOG_LOG_DATA_tag::msg}) {
        EXPECT_EQ(parser.isValidLog(bare), 0);
        bare.*field = "set";
    }
    EXPECT_EQ(parser.isValidLog(bare), 1) << "the other fields do not matter";
    EXPECT_THAT(log.Texts(), testing::Each("Invalid log!!!!!!!!!!!!! (Attention Please)"));
    EXPECT_EQ(log.Texts().size(), 6U);
}
