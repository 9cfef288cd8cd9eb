#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace kelo::tool {

// An open file, pipe or terminal, read block by block.
//
// Reading throws std::system_error. The file descriptor stays the caller's.
class BlockReader {
public:
    explicit BlockReader(int file);

    // Whether Read would return without waiting.
    bool HasInput() const;

    // The next bytes, valid until the next call of a function; none at the end of the input.
    std::string_view Read();

    // The beginning of the input: all that has been read, up to kHeadBytes.
    static constexpr size_t kHeadBytes = 4096;
    const std::string &Head() const { return head_; }

    // Reads ahead until Head() has `wanted` bytes, at most kHeadBytes, or the input ends. Call it before
    // Read.
    void ReadHead(size_t wanted);

    // Skips the next bytes, by seeking if the input allows it. Returns false when it is shorter.
    bool Skip(uint64_t bytes);

private:
    size_t ReadBehind(size_t size);
    bool SeekForward(uint64_t bytes, uint64_t fileSize);

    int file_;
    std::vector<char> buffer_;
    std::string_view ahead_; // of the buffer: the bytes that were read and not returned yet
    std::string head_;
};

} // namespace kelo::tool
