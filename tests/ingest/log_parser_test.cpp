#include "kelosyslog/logparser.h"

#include <gmock/gmock.h>

#include <map>

#include "ingest/log_samples.h"
#include "support/syslog_capture.h"

using kelo::test::SyslogCapture;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

const std::string kEleven = "local0 info 2020/01/02 10:11:12 100 200 +08:00 nas 127.0.0.1 prog tag";

_SYSLOG_LOG_DATA_tag Entry(const std::string &msg) {
    _SYSLOG_LOG_DATA_tag log;
    log.fac = "local0";
    log.prio = SYSLOG_PRIO_INFO;
    log.ldate = "2020/01/02";
    log.ltime = "10:11:12";
    log.utcsec = 100;
    log.extnum = 200;
    log.tzoffset = "+08:00";
    log.host = "nas";
    log.ip = "127.0.0.1";
    log.prog = "prog";
    log.tag = "tag";
    log.msg = msg;
    return log;
}

std::list<_SYSLOG_LOG_DATA_tag> Parsed(std::string text) {
    LogParser parser;
    EXPECT_EQ(parser.LogAdd(text), 0U);
    return parser.LogListGet();
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
        EXPECT_TRUE(log == Entry(msg)) << line.substr(0, 100);
    }
}

TEST(ParseSingleEntry, ReadsNumbersAsStrtollAndUnknownPrioritiesAsDebug) {
    const struct {
        std::string text;
        int64_t number;
    } kNumbers[] = {{"12abc", 12},
                    {"-5", -5},
                    {"+5", 5},
                    {"+-5", 0},
                    {"-", 0},
                    {"\t7", 7},
                    {"0x10", 0},
                    {"\xb2", 0},
                    {"9223372036854775808", INT64_MAX},
                    {"-9223372036854775809", INT64_MIN},
                    {std::string("1\0002", 3), 1}};
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
    _SYSLOG_LOG_DATA_tag log = Entry("before");
    EXPECT_EQ(LogParser().ParseSingleEntry("user err day clock 7  ", log), -1);
    EXPECT_EQ(log.fac + "," + log.ldate + "," + log.ltime, "user,day,clock");
    EXPECT_EQ(log.prio, SYSLOG_PRIO_ERR);
    EXPECT_EQ(log.utcsec, 7);
    EXPECT_EQ(log.extnum, 200);
    EXPECT_EQ(log.msg, "before");
    for (const std::string &line : {std::string(), std::string("   "), kEleven.substr(0, kEleven.size() - 4)})
        EXPECT_EQ(LogParser().ParseSingleEntry(line, log), -1) << line;
}

TEST(LogAdd, SkipsOnlyTheLinesThatDoNotParse) {
    SyslogCapture log;
    std::string text = kEleven + " one\r\nten fields are too few for an entry of log\n\n   \n" + kEleven;
    EXPECT_THAT(Parsed(text), ElementsAre(Entry("one\r"), Entry("")));
    EXPECT_THAT(log.Messages(), ElementsAre(kelo::test::SyslogMessage{3, "Fail to parse log"},
                                            kelo::test::SyslogMessage{3, "Fail to parse log"}));
    EXPECT_THAT(Parsed(""), IsEmpty());
}

TEST(LogAdd, PutsTheFragmentInFrontOfEveryInputUntilItIsTaken) {
    LogParser parser;
    parser.PartialLogSet(kEleven);
    for (const char *input : {" first\n", ""}) {
        std::string text = input;
        parser.LogAdd(text);
        EXPECT_EQ(text, kEleven + input);
    }
    EXPECT_EQ(parser.LogGetCount(), 2);
    EXPECT_THAT(parser.LogListTake(), ElementsAre(Entry("first"), Entry("")));
    EXPECT_EQ(parser.LogGetCount(), 0);
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
