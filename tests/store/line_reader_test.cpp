#include "store/line_reader.h"

#include <gtest/gtest.h>

namespace {

using kelo::tool::LineReader;

// The lines as NUMBER:TEXT@END, NUMBER!:TEXT@END where overlong, when the text comes in blocks of that size.
std::string Read(const std::string &text, size_t blockBytes, size_t maxLineBytes) {
    LineReader reader(maxLineBytes);
    std::string lines;
    const auto take = [&] {
        while (reader.Next())
            lines += std::to_string(reader.Number()) + (reader.IsOverlong() ? "!:" : ":") +
                     std::string(reader.Line()) + "@" + std::to_string(reader.EndOffset()) + " ";
    };
    for (size_t at = 0; at < text.size(); at += blockBytes) {
        const std::string block = text.substr(at, blockBytes); // goes, and with it what must have been kept
        reader.Feed(block);
        take();
        reader.Feed({});
    }
    reader.End();
    take();
    take();
    return lines;
}

} // namespace

TEST(LineReader, GivesTheSameLinesHoweverTheTextComes) {
    const std::string head(LineReader::kOverlongHeadBytes, 'x');
    const struct {
        std::string text;
        size_t maxLineBytes;
        std::string lines;
    } kCases[] = {
        {"", 4, ""},
        {"\n", 4, "1:@1 "},
        {"one\r\n\ntwo", 4, "1:one\r@5 2:@6 3:two@9 "},
        {"four\nfive!\nsix\n", 4, "1:four@5 2!:five!@11 3:six@15 "},
        {"five!", 4, "1!:five!@5 "},
        {head + "yz\n" + head + "\nlast", 1025, "1!:" + head + "@1027 2:" + head + "@2052 3:last@2056 "},
    };
    for (const auto &[text, maxLineBytes, lines] : kCases) {
        for (size_t blockBytes = 1; blockBytes <= text.size() + 1; ++blockBytes)
            ASSERT_EQ(Read(text, blockBytes, maxLineBytes), lines) << blockBytes;
    }
}
