#include "kelosyslog/utils.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

TEST(Tokenize, KeepsEmptyPieces) {
    EXPECT_THAT(Tokenize("", ","), IsEmpty());
    EXPECT_THAT(Tokenize("a,b;c,", ";,"), ElementsAre("a", "b", "c", ""));
    EXPECT_THAT(Tokenize(std::string("a\0b", 3), std::string("\0", 1)), ElementsAre("a", "b"));
}

TEST(EncodeJson, EscapesToTheByteAndStaysInsideTheBuffer) {
    const struct {
        const char *source;
        int32_t size, result;
        std::string written; // what the buffer starts with; the rest must be untouched
    } cases[] = {
        {"", 0, -1, ""},
        {"ab\\", 3, -1, "ab"},
        {"a\\b", 5, 0, std::string("a\\\\b\0", 5)},
        {"\n\t\x01\x7f\xff/", 7, 0, std::string("\n\t\x01\x7f\xff/\0", 7)},
    };
    for (const auto &c : cases) {
        std::string buffer(16, '#');
        EXPECT_EQ(EncodeJson(c.source, buffer.data(), c.size), c.result) << c.source << " into " << c.size;
        EXPECT_EQ(buffer, c.written + std::string(16 - c.written.size(), '#')) << c.source;
    }
}

TEST(EncodeJson, RefusesNullAndEqualPointers) {
    char buffer[] = "x\"y";
    EXPECT_EQ(EncodeJson(nullptr, buffer, 4), -1);
    EXPECT_EQ(EncodeJson(buffer, buffer, 4), -1);
    EXPECT_STREQ(buffer, "x\"y");
    EXPECT_EQ(EncodeJson(buffer, nullptr, 4), -1);
}

} // namespace
