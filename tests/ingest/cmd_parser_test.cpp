#include "kelosyslog/cmdparser.h"
#include "support/test.h"

using namespace kelo::test;

TEST(CmdParse, CutsTheTextBehindEveryClosingBrace) {
    const std::tuple<std::string, bool, size_t> kCases[] = {
        {"", true, 0},
        {"}}}", true, 0},
        {R"({"a":1}{"b":[1,{}]})", false, 1},
        {"{\"a\":1}\n{\"b\":2}", true, 2},
        {"{\"a\":1}\n{\"b\":2}\n", false, 2},
        {R"({"a":1} /* and */ {"b":2})", true, 2},
        {R"({"a":1},{"b":2})", false, 1},
        {R"({"a":"}"})", false, 0},
        {R"({"a":1}}{"b":2})", true, 2},
        {R"({"a":1}[1,2])", true, 2},
        {R"({"a":1}42)", true, 2},
        {std::string("{\"a\":\"\0\xff\"}", 10), true, 1},
        {"%s%n{", false, 0},
    };
    for (const auto &[text, parses, values] : kCases) {
        SyslogCapture log;
        std::string input = text;
        std::vector<Json::Value> commands(3);
        EXPECT_EQ(CmdParser().CmdParse(input, commands), parses) << text;
        EXPECT_EQ(commands.size(), 3 + values) << text;
        EXPECT_EQ(log.Take().size(), parses ? 0U : 1U) << text;
        EXPECT_EQ(input, text);
    }
}

TEST(CmdParse, FailsCleanlyOnDeepNesting) {
    for (const std::string opening : {"[", "{\"a\":", "[[]"}) {
        SyslogCapture log;
        std::string text;
        while (text.size() < 500'000)
            text += opening;
        std::vector<Json::Value> commands;
        EXPECT_FALSE(CmdParser().CmdParse(text, commands));
        EXPECT_THAT(log.TakeTexts(), ElementsAre(StartsWith("Error: parsing error, reason = ")));
    }
}
