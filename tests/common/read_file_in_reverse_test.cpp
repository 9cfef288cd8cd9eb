#include "kelosyslog/utils.h"
#include "support/test.h"

namespace {

using namespace kelo::test;
using Texts = std::vector<std::string>;

// Reads `stream`, closes it, and frees everything. Gives the lines from the entry count upward.
Texts ReadReversed(FILE *stream, int32_t count, int32_t max, int32_t expectedResult = 0) {
    char **array = nullptr;
    const int32_t first = count;
    Texts lines;
    EXPECT_EQ(readfileinreverse(stream, &array, count, max), expectedResult);
    fclose(stream);
    EXPECT_LE(count, std::max(first, max));
    for (int32_t i = 0; i < max; ++i) {
        EXPECT_EQ(array[i] != nullptr, i >= first && i < count) << i;
        if (array[i] != nullptr)
            lines.emplace_back(array[i]);
        free(array[i]);
    }
    free(array);
    return lines;
}

TEST(Readfileinreverse, GivesLinesFromTheLast) {
    struct Case {
        std::string content;
        int32_t count, max;
        Texts lines;
    };
    std::vector<Case> cases = {
        {"", 0, 9, {""}},
        {"\na\nb\n", 0, 9, {"", "b", "a", ""}},
        {std::string("ab\0cd\nx\0\0y", 11), 0, 9, {"x", "ab"}},
        {"a\nb\nc", 2, 4, {"c", "b"}},
        {"a\nb\nc", 3, 2, {}},
    };
    // Around the end of a block, and over several.
    for (const size_t size : {65534U, 65535U, 65536U, 65537U, 200000U})
        cases.push_back(
            {"start\n" + std::string(size, 'a') + "\nb", 0, 9, {"b", std::string(size, 'a'), "start"}});
    for (const auto &c : cases) {
        FILE *stream = tmpfile();
        fwrite(c.content.data(), 1, c.content.size(), stream);
        EXPECT_EQ(ReadReversed(stream, c.count, c.max), c.lines) << c.content.substr(0, 40);
    }
}

TEST(Readfileinreverse, ReportsAStreamThatCannotSeek) {
    SyslogCapture capture;
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    ReadReversed(fdopen(ends[0], "r"), 0, 3, -1);
    close(ends[1]);
    EXPECT_THAT(capture.Take(),
                ElementsAre(Pair(LOG_ERR, MatchesRegex("utils:[0-9]+ fseek failed\\. Illegal seek"))));
}

} // namespace
