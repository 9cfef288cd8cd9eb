#include "store/block_reader.h"

#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <system_error>
#include <utility>

namespace kelo::tool {
namespace {

constexpr size_t kBlockBytes = 128 * 1024;

[[noreturn]] void ThrowErrno() {
    throw std::system_error(errno, std::generic_category());
}

} // namespace

BlockReader::BlockReader(int file) : file_(file), buffer_(kBlockBytes) {}

bool BlockReader::HasInput() const {
    pollfd input{file_, POLLIN, 0};
    return !ahead_.empty() || poll(&input, 1, 0) != 0;
}

// Reads behind the first `size` bytes of the buffer.
size_t BlockReader::ReadBehind(size_t size) {
    ssize_t result = 0;
    do
        result = read(file_, buffer_.data() + size, buffer_.size() - size);
    while (result < 0 && errno == EINTR);
    if (result < 0)
        ThrowErrno();
    const auto count = static_cast<size_t>(result);
    head_.append(buffer_.data() + size, std::min(count, kHeadBytes - head_.size()));
    return count;
}

std::string_view BlockReader::Read() {
    if (!ahead_.empty())
        return std::exchange(ahead_, {});
    return {buffer_.data(), ReadBehind(0)};
}

void BlockReader::ReadHead(size_t wanted) {
    while (head_.size() < wanted) {
        const size_t count = ReadBehind(ahead_.size());
        if (count == 0)
            return;
        ahead_ = {buffer_.data(), ahead_.size() + count};
    }
}

bool BlockReader::Skip(uint64_t bytes) {
    for (;;) {
        const auto count = static_cast<size_t>(std::min<uint64_t>(bytes, ahead_.size()));
        ahead_.remove_prefix(count);
        bytes -= count;
        if (bytes == 0)
            return true;
        struct stat status {};
        if (fstat(file_, &status) == 0 && S_ISREG(status.st_mode))
            return SeekForward(bytes, static_cast<uint64_t>(status.st_size));
        ahead_ = Read();
        if (ahead_.empty())
            return false;
    }
}

bool BlockReader::SeekForward(uint64_t bytes, uint64_t fileSize) {
    const off_t position = lseek(file_, 0, SEEK_CUR);
    if (position < 0)
        ThrowErrno();
    const uint64_t target = static_cast<uint64_t>(position) + bytes;
    if (target > fileSize)
        return false;
    if (lseek(file_, static_cast<off_t>(target), SEEK_SET) < 0)
        ThrowErrno();
    return true;
}

} // namespace kelo::tool
