#include "store/line_reader.h"

#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <system_error>

namespace kelo::tool {
namespace {

constexpr size_t kBlockBytes = 64 * 1024;

[[noreturn]] void ThrowErrno() {
    throw std::system_error(errno, std::generic_category());
}

} // namespace

LineReader::LineReader(int fd, size_t maxLineBytes)
    : fd_(fd), maxLineBytes_(maxLineBytes), buffer_(2 * kBlockBytes) {}

void LineReader::MakeRoom() {
    if (buffer_.size() - end_ >= kBlockBytes)
        return;
    std::memmove(buffer_.data(), buffer_.data() + begin_, end_ - begin_);
    end_ -= begin_;
    begin_ = 0;
    if (buffer_.size() - end_ < kBlockBytes)
        buffer_.resize(2 * buffer_.size());
}

bool LineReader::HasInput() const {
    pollfd input{fd_, POLLIN, 0};
    return poll(&input, 1, 0) != 0;
}

// Reads at least a byte more behind what is there. Returns false at the end of the input.
bool LineReader::Fill() {
    MakeRoom();
    if (!beforeRead_())
        return false;
    ssize_t result = 0;
    do
        result = read(fd_, buffer_.data() + end_, buffer_.size() - end_);
    while (result < 0 && errno == EINTR);
    if (result < 0)
        ThrowErrno();
    const auto count = static_cast<size_t>(result);
    head_.append(buffer_.data() + end_, std::min(count, kHeadBytes - head_.size()));
    end_ += count;
    onProgress_(count);
    return count > 0;
}

void LineReader::ReadHead(size_t wanted) {
    while (head_.size() < wanted && Fill()) {
    }
}

bool LineReader::SkipTo(uint64_t offset, uint64_t lines) {
    uint64_t left = offset;
    struct stat status {};
    if (left > end_ && fstat(fd_, &status) == 0 && S_ISREG(status.st_mode)) {
        const off_t position = lseek(fd_, 0, SEEK_CUR);
        if (position < 0)
            ThrowErrno();
        const uint64_t target = static_cast<uint64_t>(position) + left - end_;
        if (target > static_cast<uint64_t>(status.st_size))
            return false;
        if (lseek(fd_, static_cast<off_t>(target), SEEK_SET) < 0)
            ThrowErrno();
        onProgress_(left - end_);
        left = 0;
        begin_ = end_;
    }
    while (left > 0) {
        const size_t count = static_cast<size_t>(std::min<uint64_t>(left, end_ - begin_));
        begin_ += count;
        left -= count;
        if (left > 0 && !Fill())
            return false;
    }
    offset_ = offset;
    number_ = lines;
    return true;
}

bool LineReader::Next() {
    isOverlong_ = false;
    size_t searched = 0;
    for (;;) {
        const char *start = buffer_.data() + begin_;
        const size_t available = end_ - begin_;
        const void *lineFeed = std::memchr(start + searched, '\n', available - searched);
        const size_t length = lineFeed != nullptr
                                  ? static_cast<size_t>(static_cast<const char *>(lineFeed) - start)
                                  : available;
        if (length > maxLineBytes_) {
            SkipOverlongLine();
            return true;
        }
        searched = length;
        if (lineFeed == nullptr && Fill())
            continue;
        if (lineFeed == nullptr && available == 0)
            return false;
        line_ = {start, length};
        const size_t taken = length + (lineFeed != nullptr ? 1 : 0);
        begin_ += taken;
        offset_ += taken;
        ++number_;
        return true;
    }
}

void LineReader::SkipOverlongLine() {
    uint64_t skipped = 0;
    overlongHead_.assign(buffer_.data() + begin_, std::min(end_ - begin_, kOverlongHeadBytes));
    bool ended = false;
    while (!ended) {
        const char *start = buffer_.data() + begin_;
        const void *lineFeed = std::memchr(start, '\n', end_ - begin_);
        const size_t length = lineFeed != nullptr
                                  ? static_cast<size_t>(static_cast<const char *>(lineFeed) - start) + 1
                                  : end_ - begin_;
        begin_ += length;
        skipped += length;
        ended = lineFeed != nullptr || !Fill();
    }
    // Only now: who is told of a wait within the line must not see a part of it as read.
    isOverlong_ = true;
    line_ = overlongHead_;
    offset_ += skipped;
    ++number_;
}

} // namespace kelo::tool
