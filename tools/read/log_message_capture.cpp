#include "read/log_message_capture.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>

namespace kelo::tool {
namespace {

constexpr const char *kIdentity = "kelosyslog";

} // namespace

LogMessageCapture::LogMessageCapture() {
    file_ = memfd_create("messages", MFD_CLOEXEC);
    savedError_ = fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
    if (file_ < 0 || savedError_ < 0 || dup2(file_, STDERR_FILENO) < 0)
        return;
    openlog(kIdentity, LOG_PERROR, LOG_USER);
}

LogMessageCapture::~LogMessageCapture() {
    openlog(kIdentity, 0, LOG_USER);
    if (savedError_ >= 0) {
        dup2(savedError_, STDERR_FILENO);
        close(savedError_);
    }
    if (file_ >= 0)
        close(file_);
}

std::string LogMessageCapture::FirstLine() const {
    char text[4096];
    const ssize_t size = file_ < 0 ? -1 : pread(file_, text, sizeof text, 0);
    if (size <= 0)
        return "";
    std::string line(text, static_cast<size_t>(size));
    line.resize(std::min(line.find('\n'), line.size()));
    const std::string prefix = std::string(kIdentity) + ": ";
    return line.starts_with(prefix) ? line.substr(prefix.size()) : line;
}

} // namespace kelo::tool
