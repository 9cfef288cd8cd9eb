#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <random>

#include "kelosyslog/utils.h"
#include "support/syslog_capture.h"

namespace {

using kelo::test::SyslogCapture;
using testing::IsEmpty;
using testing::MatchesRegex;

struct Lines {
    int32_t result = 0;
    std::vector<std::string> texts; // from the entry count upward
};

// Reads `stream`, closes it, and frees everything.
Lines ReadReversed(FILE *stream, int32_t count, int32_t max) {
    char **array = nullptr;
    const int32_t first = count;
    Lines lines;
    lines.result = readfileinreverse(stream, &array, count, max);
    fclose(stream);
    for (int32_t i = 0; array != nullptr && i < max; ++i) {
        const bool stored = i >= first && i < count;
        EXPECT_EQ(array[i] != nullptr, stored) << i;
        if (array[i] != nullptr)
            lines.texts.emplace_back(array[i]);
        free(array[i]);
    }
    free(array);
    return lines;
}

FILE *StreamOf(const std::string &content) {
    FILE *stream = tmpfile();
    fwrite(content.data(), 1, content.size(), stream);
    return stream;
}

// The same answer by walking back byte by byte.
std::vector<std::string> Reference(const std::string &content, int32_t count, int32_t max) {
    std::vector<std::string> lines;
    const auto isFull = [&] { return count + static_cast<int64_t>(lines.size()) >= max; };
    if (isFull())
        return lines;
    std::string line; // backwards
    const auto store = [&] { lines.emplace_back(line.rbegin(), line.rend()); };
    for (size_t i = content.size(); i-- > 0;) {
        if (content[i] == '\n') {
            store();
            line.clear();
        } else if (content[i] == '\0') {
            line.clear();
        } else {
            line += content[i];
        }
        if (i > 0 && isFull())
            return lines;
    }
    if (!isFull())
        store();
    return lines;
}

TEST(Readfileinreverse, GivesLinesFromTheLast) {
    const struct {
        std::string content;
        std::vector<std::string> lines;
    } cases[] = {
        {"", {""}},
        {"\n", {"", ""}},
        {"a\nb\n", {"", "b", "a"}},
        {"a\nb", {"b", "a"}},
        {"\na", {"a", ""}},
        {std::string("ab\0cd\nx\0\0y", 11), {"x", "ab"}},
        {std::string("\0abc", 4), {""}},
        {std::string("\0", 1), {""}},
    };
    for (const auto &c : cases) {
        const SyslogCapture capture;
        const Lines lines = ReadReversed(StreamOf(c.content), 0, 10);
        EXPECT_EQ(lines.result, 0);
        EXPECT_EQ(lines.texts, c.lines) << testing::PrintToString(c.content);
        EXPECT_THAT(capture.Messages(), IsEmpty());
    }
}

TEST(Readfileinreverse, AgreesWithAWalkBackByteByByte) {
    std::mt19937 random(20200102); // repeatable
    const auto below = [&](uint32_t bound) {
        return std::uniform_int_distribution<uint32_t>(0, bound - 1)(random);
    };
    for (int round = 0; round < 400; ++round) {
        std::string content;
        for (uint32_t pieces = below(12); pieces > 0; --pieces) {
            // Around the sizes where blocks and line buffers end, and now and then beyond.
            static const uint32_t kLengths[] = {0,    1,    2,     40,    1022,  1023,
                                                1024, 1025, 65535, 65536, 65537, 200000};
            content.append(kLengths[below(round % 20 == 0 ? 12 : 8)], static_cast<char>('a' + below(26)));
            content += std::string("\n\n\0z", 4)[below(4)];
        }
        const auto count = static_cast<int32_t>(below(4));
        const auto max = static_cast<int32_t>(below(2) == 0 ? below(6) : 40);
        const Lines lines = ReadReversed(StreamOf(content), count, max);
        ASSERT_EQ(lines.result, 0);
        ASSERT_EQ(lines.texts, Reference(content, count, max))
            << "round " << round << ", count " << count << ", max " << max;
    }
}

// A stream of 200,000 bytes of lines that fails at the seek number `seeks`.
struct FailingStream {
    static constexpr off64_t kLength = 200000;
    int seeks = 0;
    bool failsReads = false;
    off64_t position = 0;

    FILE *Open() {
        cookie_io_functions_t functions{};
        functions.read = [](void *cookie, char *buffer, size_t size) -> ssize_t {
            auto &self = *static_cast<FailingStream *>(cookie);
            if (self.failsReads)
                return -1;
            const auto count = std::min(static_cast<off64_t>(size), kLength - self.position);
            std::fill_n(buffer, count, '\n');
            self.position += count;
            return static_cast<ssize_t>(count);
        };
        functions.seek = [](void *cookie, off64_t *offset, int whence) {
            auto &self = *static_cast<FailingStream *>(cookie);
            if (--self.seeks == 0) {
                errno = ENXIO;
                return -1;
            }
            self.position = *offset + (whence == SEEK_END ? kLength : whence == SEEK_CUR ? self.position : 0);
            *offset = self.position;
            return 0;
        };
        FILE *stream = fopencookie(this, "r", functions);
        setvbuf(stream, nullptr, _IONBF, 0);
        return stream;
    }
};

TEST(Readfileinreverse, ReportsASeekThatFails) {
    int failures = 0;
    for (int seek = 1; seek < 50; ++seek) {
        const SyslogCapture capture;
        FailingStream stream{seek};
        const Lines lines = ReadReversed(stream.Open(), 0, 300000);
        if (lines.result == 0)
            break;
        ++failures;
        EXPECT_EQ(lines.result, -1);
        // glibc answers ftell by a seek too.
        ASSERT_EQ(capture.Messages().size(), 1u);
        EXPECT_EQ(capture.Messages()[0].priority, LOG_ERR);
        EXPECT_THAT(capture.Messages()[0].text,
                    MatchesRegex("utils:[0-9]+ f(seek|tell) failed\\. No such device or address"));
    }
    EXPECT_GE(failures, 4);
}

TEST(Readfileinreverse, ReportsAStreamThatCannotSeek) {
    const SyslogCapture capture;
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    EXPECT_EQ(ReadReversed(fdopen(ends[0], "r"), 0, 3).result, -1);
    close(ends[1]);
    ASSERT_EQ(capture.Messages().size(), 1u);
    EXPECT_THAT(capture.Messages()[0].text, MatchesRegex("utils:[0-9]+ fseek failed\\. Illegal seek"));
}

TEST(Readfileinreverse, FailsSilentlyWhenTheStreamCannotBeRead) {
    const SyslogCapture capture;
    FailingStream stream{0, true};
    const Lines lines = ReadReversed(stream.Open(), 0, 3);
    EXPECT_EQ(lines.result, -1);
    EXPECT_THAT(lines.texts, IsEmpty());
    EXPECT_THAT(capture.Messages(), IsEmpty());
}

} // namespace
