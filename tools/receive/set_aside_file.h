#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "base/files.h"

namespace kelo::tool {

// The file for lines that are not valid records: one line each, after the local time and the reason,
// separated by tabs. Only the beginning of a long line is kept.
//
// A full file is renamed to its name with ".1", over an older one. If the file cannot be written, this is
// reported in the system log once; the lines are then lost, without further effect.
class SetAsideFile {
public:
    // Opens nothing yet. A missing folder is created.
    explicit SetAsideFile(std::string path) : path_(std::move(path)) {}
    ~SetAsideFile() { Flush(); }
    SetAsideFile(const SetAsideFile &) = delete;
    SetAsideFile &operator=(const SetAsideFile &) = delete;

    void Add(std::string_view reason, std::string_view line);

    // Call it about once a second, unless idle. Writes the added lines, and reports them in the system log at
    // most once a minute; `now` is seconds of any clock that does not go back.
    void Tick(int64_t now);

    // Whether all that was added has been written and reported.
    bool IsIdle() const { return unreported_ == 0 && buffer_.empty(); }

    // The same, without waiting for the minute.
    void Finish();

    // Reopens the file by its name, which may be another file by now.
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
