#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace kelo::tool {

// Splits text into lines, piece by piece, in memory limited by the longest line allowed:
//
//     reader.Feed(bytes);            // or End(), after the last ones
//     while (reader.Next())
//         Use(reader.Line());
class LineReader {
public:
    // `maxLineBytes` does not include the line feed.
    explicit LineReader(size_t maxLineBytes) : maxLineBytes_(maxLineBytes) {}

    // The text begins after `offset` bytes of its input, which end the line number `lines`.
    void StartAt(uint64_t offset, uint64_t lines);

    // The text continues with these bytes, which must stay until Next has returned false.
    void Feed(std::string_view bytes) { rest_ = bytes; }

    // The text has ended. Its last line needs no line feed.
    void End() { hasEnded_ = true; }

    // Advances to the next complete line. Returns false when there is none.
    bool Next();

    // The current line, without its line feed; of an overlong one the first kOverlongHeadBytes. Valid until
    // Next.
    static constexpr size_t kOverlongHeadBytes = 1024;
    std::string_view Line() const { return line_; }
    bool IsOverlong() const { return isOverlong_; }
    // Its number, from 1.
    uint64_t Number() const { return number_; }
    // The offset after its line feed.
    uint64_t EndOffset() const { return offset_; }

private:
    void Keep(std::string_view piece);

    size_t maxLineBytes_;
    std::string_view rest_; // of what was fed
    bool hasEnded_ = false;
    // The line that has begun: its bytes so far, and those of them that were fed before, of an overlong line
    // only the first ones.
    uint64_t lineBytes_ = 0;
    std::string kept_;
    uint64_t offset_ = 0;
    uint64_t number_ = 0;
    std::string_view line_;
    bool isOverlong_ = false;
};

} // namespace kelo::tool
