#include "receive/spool_file.h"

#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <system_error>
#include <utility>

namespace kelo::tool {
namespace {

// The end of the names of files that recover-buffer makes out of messages for sql().
constexpr const char *kCounted = ".counted";

size_t ReadAt(int file, char *buffer, size_t bytes, uint64_t offset) {
    ssize_t count = 0;
    do
        count = pread(file, buffer, bytes, static_cast<off_t>(offset));
    while (count < 0 && errno == EINTR);
    if (count < 0)
        throw std::system_error(errno, std::generic_category(), "message spool");
    return static_cast<size_t>(count);
}

} // namespace

SpoolFile::SpoolFile(FileHandle opened, const struct stat &status, std::string itsName)
    : file(std::move(opened)), inode(status.st_ino), name(std::move(itsName)) {
    Refresh();
    isCounted = name.ends_with(kCounted);
    if (isCounted)
        Of(SpoolReader::kCounts) = {size, size};
}

std::string_view SpoolFile::Read(std::string &buffer, uint64_t limit) const {
    buffer.resize(kBlockBytes);
    const uint64_t most = limit > position ? limit - position : 0;
    const auto bytes = static_cast<size_t>(std::min<uint64_t>(most, kBlockBytes));
    return {buffer.data(), ReadAt(file.Get(), buffer.data(), bytes, position)};
}

void SpoolFile::Refresh() {
    struct stat status {};
    if (fstat(file.Get(), &status) != 0)
        return;
    size = static_cast<uint64_t>(status.st_size);
    modified = status.st_mtime;
    isRemoved = status.st_nlink == 0;
    if (size >= position)
        return;
    syslog(LOG_ERR, "%s in the message spool has become shorter and is read from its beginning",
           name.c_str());
    position = 0;
    std::fill(std::begin(progress), std::end(progress), Progress{});
    receipts.Clear();
}

std::string SpoolFile::Head(uint64_t bytes) const {
    std::string head(static_cast<size_t>(std::min<uint64_t>(bytes, kHeadBytes)), '\0');
    head.resize(ReadAt(file.Get(), head.data(), head.size(), 0));
    return head;
}

SpoolPlace SpoolFile::Place(SpoolReader reader) const {
    const uint64_t offset = progress[static_cast<size_t>(reader)].offset;
    return {inode, Head(offset), offset};
}

void SpoolFile::Restore(SpoolReader reader, const SpoolPlace &place) {
    if (place.offset <= size && place.head == Head(place.offset))
        Of(reader) = {place.offset, place.offset};
}

uint64_t SpoolFile::Saved() const {
    uint64_t saved = progress[0].saved;
    for (const Progress &one : progress)
        saved = std::min(saved, one.saved);
    return saved;
}

} // namespace kelo::tool
