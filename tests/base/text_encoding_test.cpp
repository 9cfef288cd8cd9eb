#include "base/text_encoding.h"

#include <gtest/gtest.h>

#include "base/json.h"

namespace kelo::tool {
namespace {

// Texts are looked at 16 bytes at a time, and 8 where they are shorter.
TEST(TextEncoding, EscapesASpecialByteWhereverItIs) {
    for (size_t size = 1; size < 40; ++size) {
        for (size_t at = 0; at < size; ++at) {
            std::string text(size, 'a');
            for (const char special : {'"', '\\', '\n', '\x1f', '\x7f'}) {
                text[at] = special;
                std::string json;
                EXPECT_TRUE(AppendJsonString(json, text));
                EXPECT_EQ(ParseJson("{\"text\":" + json + "}")["text"].asString(), text);
                EXPECT_GT(json.size(), text.size() + 2);
            }
            text[at] = '\xff';
            std::string replaced;
            EXPECT_FALSE(AppendJsonString(replaced, text));
            for (const char special : {',', '"', '\r', '\n'}) {
                text[at] = special;
                std::string line;
                AppendCsvLine(line, {text, "b"});
                EXPECT_EQ(line, '"' + (special == '"' ? text.substr(0, at) + '"' + text.substr(at) : text) +
                                    "\",b\r\n");
            }
        }
    }
}

} // namespace
} // namespace kelo::tool
