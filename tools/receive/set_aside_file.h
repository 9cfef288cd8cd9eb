#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "base/files.h"

namespace kelo::tool {

// The file that keeps the lines which give no log: one line each, with the local time and the reason in
// front, separated by tabs. Of a long line its beginning is kept.
//
// When the file is full it is renamed with ".1" behind its name, over an older one. That it cannot be written
// is reported in the system log, once until it can again; the lines are then lost, and nothing else happens.
class SetAsideFile {
public:
    // Opens nothing yet. The folder is created where it is missing.
    explicit SetAsideFile(std::string path) : path_(std::move(path)) {}
    ~SetAsideFile() { Flush(); }
    SetAsideFile(const SetAsideFile &) = delete;
    SetAsideFile &operator=(const SetAsideFile &) = delete;

    void Add(std::string_view reason, std::string_view line);

    // To be called about once a second, unless idle. Writes what was added, and tells the system log of it,
    // at most once a minute; `now` is seconds of any clock that does not go back.
    void Tick(int64_t now);

    // Whether all that was added has been written and reported.
    bool IsIdle() const { return unreported_ == 0 && buffer_.empty(); }

    // The same, without waiting for the minute.
    void Finish();

    // Goes on in a file of that name, which may be another one by now.
    void Reopen();

    static constexpr size_t kLineBytes = 8 * 1024; // kept of a line
    static constexpr int64_t kFullBytes = 8 * 1024 * 1024;

private:
    void Flush();
    bool Open();
    bool MakeRoom();
    void Report();

    std::string path_;
    FileHandle file_;
    int64_t size_ = 0;
    std::string buffer_;
    bool isFailing_ = false;
    uint64_t unreported_ = 0;
    std::string lastReason_;
    int64_t nextReport_ = INT64_MIN;
};

} // namespace kelo::tool
