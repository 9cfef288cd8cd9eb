#include "kelosyslog/utils.h"

#include <syslog.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>

#include "common/failure.h"

namespace {

struct Free {
    void operator()(char *buffer) const { std::free(buffer); }
};
using Buffer = std::unique_ptr<char, Free>;

bool SeekTo(FILE *stream, long offset, int whence) {
    if (std::fseek(stream, offset, whence) == 0)
        return true;
    syslog(LOG_ERR, "%s:%d fseek failed. %m", "utils", __LINE__);
    return false;
}

// The bytes of a stream by their position, read in blocks from the end towards the start as they are asked
// for.
class BackwardReader {
public:
    BackwardReader(FILE *stream, char *buffer, long length)
        : stream_(stream), buffer_(buffer), start_(length) {}

    // Makes the byte at `position` available in the buffer. Returns false when it cannot be read.
    bool Reach(long position) {
        if (position >= start_)
            return true;
        const long blockStart = std::max(0L, start_ - kBlockSize);
        if (!SeekTo(stream_, blockStart, SEEK_SET))
            return false;
        const auto wanted = static_cast<size_t>(start_ - blockStart);
        if (std::fread(buffer_ + blockStart, 1, wanted, stream_) != wanted)
            return false;
        start_ = blockStart;
        return true;
    }

private:
    static constexpr long kBlockSize = 64 * 1024;
    FILE *stream_;
    char *buffer_;
    long start_; // what lies from here on has been read
};

// The caller's array of lines, filled up to its maximum.
class LineArray {
public:
    LineArray(char **lines, int32_t &count, int32_t max) : lines_(lines), count_(count), max_(max) {}

    bool IsFull() const { return count_ >= max_; }

    // Stores a copy of the bytes up to the first NUL among them. Returns false when out of memory.
    bool Add(const char *text, size_t length) {
        lines_[count_] = strndup(text, length);
        if (lines_[count_] == nullptr)
            return false;
        ++count_;
        return true;
    }

private:
    char **lines_;
    int32_t &count_;
    int32_t max_;
};

int32_t CollectLines(BackwardReader &reader, const char *buffer, long length, LineArray &lines) {
    long lineEnd = length;
    for (long position = length - 1; position >= 0; --position) {
        if (!reader.Reach(position))
            return -1;
        if (buffer[position] == '\n') {
            if (!lines.Add(buffer + position + 1, static_cast<size_t>(lineEnd - position - 1)))
                return -1;
            lineEnd = position;
            if (lines.IsFull())
                return 0;
        }
    }
    return lines.Add(buffer, static_cast<size_t>(lineEnd)) ? 0 : -1;
}

int32_t ReadInReverse(FILE *stream, char ***lines, int32_t &count, int32_t max) {
    *lines = static_cast<char **>(std::calloc(static_cast<size_t>(max), sizeof(char *)));
    if (*lines == nullptr) {
        syslog(LOG_ERR, "%s:%d calloc failed. %m", "utils", __LINE__);
        return -1;
    }
    if (!SeekTo(stream, 0, SEEK_END))
        return -1;
    const long length = std::ftell(stream);
    if (length < 0) {
        syslog(LOG_ERR, "%s:%d ftell failed. %m", "utils", __LINE__);
        return -1;
    }
    const Buffer buffer(static_cast<char *>(std::malloc(static_cast<size_t>(length) + 1)));
    if (buffer == nullptr) {
        syslog(LOG_ERR, "%s:%d malloc failed. %m", "utils", __LINE__);
        return -1;
    }
    // An empty file has no last byte to seek to; it still has one empty line.
    if (length > 0 && !SeekTo(stream, length - 1, SEEK_SET))
        return -1;
    LineArray target(*lines, count, max);
    if (target.IsFull())
        return 0;
    BackwardReader reader(stream, buffer.get(), length);
    return CollectLines(reader, buffer.get(), length, target);
}

} // namespace

int32_t readfileinreverse(FILE *stream, char ***lines, int32_t &count, int32_t max) {
    const int32_t result = ReadInReverse(stream, lines, count, max);
    return result == 0 ? 0 : kelo::FailWithErrno("", "readfileinreverse", errno);
}
