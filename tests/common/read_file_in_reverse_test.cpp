#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>

#include "kelosyslog/utils.h"
#include "support/syslog_capture.h"
#include "support/temp_root.h"

namespace {

using kelo::test::SyslogCapture;
using kelo::test::TempRoot;
using testing::MatchesRegex;
using Texts = std::vector<std::string>;

struct Lines {
    int32_t result = 0;
    Texts texts; // from the entry count upward
};

// Reads `stream`, closes it, and frees everything.
Lines ReadReversed(FILE *stream, int32_t count, int32_t max) {
    char **array = nullptr;
    const int32_t first = count;
    Lines lines;
    lines.result = readfileinreverse(stream, &array, count, max);
    fclose(stream);
    EXPECT_LE(count, std::max(first, max));
    for (int32_t i = 0; i < max; ++i) {
        EXPECT_EQ(array[i] != nullptr, i >= first && i < count) << i;
        if (array[i] != nullptr)
            lines.texts.emplace_back(array[i]);
        free(array[i]);
    }
    free(array);
    return lines;
}

void ExpectLines(const std::string &content, int32_t count, int32_t max, const Texts &expected) {
    FILE *stream = tmpfile();
    fwrite(content.data(), 1, content.size(), stream);
    const Lines lines = ReadReversed(stream, count, max);
    EXPECT_EQ(lines.result, 0);
    EXPECT_EQ(lines.texts, expected) << testing::PrintToString(content.substr(0, 40));
}

TEST(Readfileinreverse, GivesLinesFromTheLast) {
    const struct {
        std::string content;
        int32_t count, max;
        Texts lines;
    } cases[] = {
        {"", 0, 9, {""}},
        {"\n", 0, 9, {"", ""}},
        {"a\nb\n", 0, 9, {"", "b", "a"}},
        {"\na\nb", 0, 9, {"b", "a", ""}},
        {std::string("ab\0cd\nx\0\0y", 11), 0, 9, {"x", "ab"}},
        {std::string("\0abc", 4), 0, 9, {""}},
        {"a\nb\nc", 0, 2, {"c", "b"}},
        {"a\nb\nc", 2, 4, {"c", "b"}},
        {"a\nb\nc", 0, 0, {}},
        {"a\nb\nc", 3, 2, {}},
    };
    for (const auto &c : cases)
        ExpectLines(c.content, c.count, c.max, c.lines);
    // Around the end of a block, and over several.
    for (const size_t size : {65534U, 65535U, 65536U, 65537U, 200000U})
        ExpectLines("start\n" + std::string(size, 'a') + "\nb", 0, 9, {"b", std::string(size, 'a'), "start"});
}

TEST(Readfileinreverse, ReportsAStreamThatCannotSeek) {
    const SyslogCapture capture;
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    EXPECT_EQ(ReadReversed(fdopen(ends[0], "r"), 0, 3).result, -1);
    close(ends[1]);
    ASSERT_EQ(capture.Messages().size(), 1u);
    EXPECT_EQ(capture.Messages()[0].priority, LOG_ERR);
    EXPECT_THAT(capture.Messages()[0].text, MatchesRegex("utils:[0-9]+ fseek failed\\. Illegal seek"));
}

TEST(Readfileinreverse, FailsSilentlyWhenTheStreamCannotBeRead) {
    const SyslogCapture capture;
    const TempRoot root;
    FILE *writeOnly = fopen(root.File("log").c_str(), "w");
    fputs("text", writeOnly);
    EXPECT_EQ(ReadReversed(writeOnly, 0, 3).result, -1);
    EXPECT_THAT(capture.Messages(), testing::IsEmpty());
}

} // namespace
