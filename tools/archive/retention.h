#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace kelo::tool {

// An archive of a folder, described by its name and its row of db_info.
struct Archive {
    std::string name;
    std::string device;
    int64_t first = 0; // time of the oldest record, seconds since the epoch
    int64_t last = 0;  // of the newest; 0 or less if unknown
    uint64_t logs = 0;
    uint64_t bytes = 0;
};

// The archives of a folder, those with the oldest last record first; none when there is no such folder. Files
// with other names or without a readable row of db_info are ignored. Throws OutputError when the folder
// cannot be read.
std::vector<Archive> ListArchives(const std::string &folder);

// The archives to keep.
struct Retention {
    std::optional<int64_t> since;  // archives whose last record has this second or later, or no known time
    std::optional<uint64_t> bytes; // and of these the newest up to this size in all
    std::string spared;            // name of an archive that is always kept
};

// The archives that a retention does not keep, oldest first. `archives` is sorted as ListArchives does.
std::vector<Archive> Expired(const std::vector<Archive> &archives, const Retention &retention);

// Reads a number of bytes: digits, and K, M, G or T (of 1024), also as "KiB" or "KB". Throws UsageError that
// names `option` and `text`.
uint64_t ParseSize(const std::string &option, const std::string &text);

// "512 B", "1.5 KiB", "2.0 GiB".
std::string FormatSize(uint64_t bytes);

} // namespace kelo::tool
