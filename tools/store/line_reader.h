#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace kelo::tool {

// The lines of an open file, pipe or terminal, in memory that is bounded by the longest line allowed.
//
// Reading throws std::system_error. The file descriptor stays the caller's.
class LineReader {
public:
    // `maxLineBytes` does not include the line feed.
    LineReader(int fd, size_t maxLineBytes);

    // Called before each read; the lines before the current one have been dealt with then. It may wait, and
    // ends the input by returning false.
    void BeforeRead(std::function<bool()> beforeRead) { beforeRead_ = std::move(beforeRead); }

    // Whether a read would find data, or the end of the input, without waiting.
    bool HasInput() const;

    // Called with the number of bytes whenever some were read or skipped.
    void OnProgress(std::function<void(uint64_t)> onProgress) { onProgress_ = std::move(onProgress); }

    // What the input begins with: all that has been read, up to kHeadBytes.
    static constexpr size_t kHeadBytes = 4096;
    const std::string &Head() const { return head_; }

    // Reads until Head() has `wanted` bytes, at most kHeadBytes, or the input ends.
    void ReadHead(size_t wanted);

    // Goes on behind the first `offset` bytes, which end the line number `lines`, by seeking where the input
    // allows it. To be called before Next; Head() must have all its bytes when more is skipped. Returns false
    // when the input is shorter.
    bool SkipTo(uint64_t offset, uint64_t lines);

    // Advances to the next line, the last of which needs no line feed. Returns false at the end.
    bool Next();

    // The current line, without its line feed; of an overlong one the first kOverlongHeadBytes. Valid until
    // Next.
    static constexpr size_t kOverlongHeadBytes = 1024;
    std::string_view Line() const { return line_; }
    bool IsOverlong() const { return isOverlong_; }
    // Its number, from 1.
    uint64_t Number() const { return number_; }
    // The offset behind its line feed.
    uint64_t EndOffset() const { return offset_; }

private:
    bool Fill();
    void MakeRoom();
    void SkipOverlongLine();

    int fd_;
    size_t maxLineBytes_;
    std::function<bool()> beforeRead_ = [] { return true; };
    std::function<void(uint64_t)> onProgress_ = [](uint64_t) {};
    std::string head_;
    std::vector<char> buffer_;
    size_t begin_ = 0; // what is read and not yet taken lies in [begin_, end_)
    size_t end_ = 0;
    uint64_t offset_ = 0;
    uint64_t number_ = 0;
    std::string_view line_;
    std::string overlongHead_;
    bool isOverlong_ = false;
};

} // namespace kelo::tool
