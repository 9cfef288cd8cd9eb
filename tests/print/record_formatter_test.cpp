#include "print/record_formatter.h"

#include <json/json.h>

#include <sstream>

#include "base/text_encoding.h"
#include "print/output.h"
#include "support/test.h"

namespace kelo::tool {
namespace {

using Log = _SYSLOG_LOG_DATA_tag;

Log HostileLog() {
    Log log;
    log.id = 18446744073709551615U;
    log.utcsec = 1577959872;
    log.prio = SYSLOG_PRIO_ERR;
    log.host = "h\"o,s't";
    log.prog = "\x1b]0;owned\x07";
    log.msg = "a\\b\r\nc\td \xff\xc3( \xed\xa0\x80 \xc2\x9b"
              "31m \xe2\x80\xae \xe6\x97\xa5\xe6\x9c\xac";
    return log;
}

std::string Print(const RecordLayout &layout, const std::vector<Log> &logs) {
    std::string out;
    const std::unique_ptr<RecordFormatter> writer = MakeRecordWriter(layout);
    writer->Begin(out);
    for (const Log &log : logs)
        writer->Add(log, out);
    writer->End(out);
    return out;
}

RecordLayout Layout(OutputFormat format, const std::string &fields = "") {
    RecordLayout layout;
    layout.format = format;
    layout.inUtc = true;
    if (!fields.empty())
        layout.fields = ParseFields(fields, TableKind::Logs);
    return layout;
}

Json::Value ParseJson(const std::string &text) {
    Json::Value value;
    std::istringstream(text) >> value; // throws for what is no JSON
    return value;
}

TEST(RecordFormatter, WritesValidJsonWhateverALogHolds) {
    const Log log = HostileLog();
    const Json::Value array = ParseJson(Print(Layout(OutputFormat::Json), {log, Log{}}));
    ASSERT_EQ(array.size(), 2U);
    const Json::Value object = array[0];
    EXPECT_EQ(object["id"].asUInt64(), log.id);
    EXPECT_EQ(object["time"].asString(), "2020-01-02T10:11:12+00:00");
    EXPECT_EQ(object["prio"].asString(), "err");
    EXPECT_EQ(object["host"].asString(), log.host);
    EXPECT_EQ(object["prog"].asString(), log.prog);
    const std::string kReplaced = "\xef\xbf\xbd";
    EXPECT_EQ(object["msg"].asString(), "a\\b\r\nc\td " + kReplaced + kReplaced + "( " + kReplaced +
                                            kReplaced + kReplaced +
                                            " \xc2\x9b"
                                            "31m \xe2\x80\xae \xe6\x97\xa5\xe6\x9c\xac");
    EXPECT_EQ(ParseJson(Print(Layout(OutputFormat::Json), {})).size(), 0U);

    const std::string line = Print(Layout(OutputFormat::Jsonl), {log});
    EXPECT_EQ(ParseJson(line), object);
    EXPECT_EQ(std::count_if(line.begin(), line.end(), [](unsigned char byte) { return byte < 0x20; }), 1);
    EXPECT_EQ(line.back(), '\n');
}

TEST(RecordFormatter, WritesCsvByteForByte) {
    const Log log = HostileLog();
    EXPECT_EQ(Print(Layout(OutputFormat::Csv, "host,prog,msg,llevel,id"), {log, Log{}}),
              "host,prog,msg,prio,id\r\n\"h\"\"o,s't\"," + log.prog + ",\"" + log.msg +
                  "\",err,18446744073709551615\r\n,,,emerg,0\r\n");
    RecordLayout bare = Layout(OutputFormat::Csv, "msg");
    bare.hasHeader = false;
    EXPECT_EQ(Print(bare, {Log{}}), "\"\"\r\n");
}

TEST(RecordFormatter, ShowsControlBytesInsteadOfSendingThemToTheTerminal) {
    const std::string message = R"(a\b\r\nc\td \xff\xc3( \xed\xa0\x80 \u009b31m \u202e )"
                                "\xe6\x97\xa5\xe6\x9c\xac";
    EXPECT_EQ(Print(Layout(OutputFormat::Short), {HostileLog()}),
              "Jan 02 10:11:12 h\"o,s't \\x1b]0;owned\\x07: " + message + "\n");
    EXPECT_EQ(Print(Layout(OutputFormat::Text, "prog,msg"), {HostileLog()}),
              "PROG              MSG\n\\x1b]0;owned\\x07  " + message + "\n");
}

} // namespace
} // namespace kelo::tool
