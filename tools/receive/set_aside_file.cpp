#include "receive/set_aside_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <system_error>

namespace kelo::tool {
namespace {

constexpr size_t kBufferBytes = 64 * 1024;
constexpr int64_t kReportSec = 60;

std::string LocalTime() {
    const std::time_t now = std::time(nullptr);
    std::tm parts{};
    localtime_r(&now, &parts);
    char text[32];
    return {text, std::strftime(text, sizeof text, "%Y/%m/%d %H:%M:%S", &parts)};
}

} // namespace

void SetAsideFile::Add(std::string_view reason, std::string_view line) {
    ++unreported_;
    lastReason_ = reason;
    buffer_.append(LocalTime()).append(1, '\t').append(reason).append(1, '\t');
    buffer_.append(line.substr(0, kLineBytes)).append(1, '\n');
    if (buffer_.size() >= kBufferBytes)
        Flush();
}

void SetAsideFile::Tick(int64_t now) {
    Flush();
    if (unreported_ == 0 || now < nextReport_)
        return;
    nextReport_ = now + kReportSec;
    Report();
}

void SetAsideFile::Finish() {
    Flush();
    if (unreported_ > 0)
        Report();
}

void SetAsideFile::Report() {
    syslog(LOG_WARNING, "%llu lines were set aside, the last one as %s; see %s",
           static_cast<unsigned long long>(unreported_), lastReason_.c_str(), path_.c_str());
    unreported_ = 0;
}

void SetAsideFile::Reopen() {
    Flush();
    file_ = FileHandle();
}

bool SetAsideFile::Open() {
    std::error_code ignored; // opening fails then, and says why
    std::filesystem::create_directories(std::filesystem::path(path_).parent_path(), ignored);
    constexpr int kFlags = O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK;
    file_ = FileHandle(open(path_.c_str(), kFlags, 0640));
    struct stat status {};
    if (!file_ || fstat(file_.Get(), &status) != 0)
        return false;
    size_ = status.st_size;
    return true;
}

// Opens the file, or a fresh one if the text would no longer fit.
bool SetAsideFile::MakeRoom() {
    if (!file_ && !Open())
        return false;
    if (size_ == 0 || size_ + static_cast<int64_t>(buffer_.size()) <= kFullBytes)
        return true;
    return std::rename(path_.c_str(), (path_ + ".1").c_str()) == 0 && Open();
}

void SetAsideFile::Flush() {
    if (buffer_.empty())
        return;
    const bool isWritten = MakeRoom() && WriteAll(file_.Get(), buffer_);
    if (!isWritten && !isFailing_)
        syslog(LOG_ERR, "cannot keep the lines that are set aside in %s: %s", path_.c_str(),
               std::strerror(errno));
    isFailing_ = !isWritten;
    if (isWritten) {
        size_ += static_cast<int64_t>(buffer_.size());
    } else if (file_) { // the next line must not continue a partial one
        [[maybe_unused]] const int isCut = ftruncate(file_.Get(), size_);
        file_ = FileHandle();
    }
    buffer_.clear();
}

} // namespace kelo::tool
