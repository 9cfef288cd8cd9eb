#include "archive/retention.h"

#include <algorithm>
#include <charconv>
#include <cstdio>
#include <filesystem>
#include <string_view>
#include <tuple>

#include "archive/archive_name.h"
#include "archive/open_options.h"
#include "base/errors.h"

namespace kelo::tool {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view kUnits = "KMGT";

std::optional<Archive> ReadArchive(const fs::directory_entry &file) {
    Archive archive;
    archive.name = file.path().filename().string();
    std::error_code error;
    if (!IsArchiveName(archive.name) || !fs::is_regular_file(file.symlink_status(error)))
        return std::nullopt;
    archive.bytes = file.file_size(error);
    try {
        SqliteConnection database(file.path().string(), kToRead);
        // A view could take any time.
        if (database.Number(
                "SELECT count(*) FROM sqlite_master WHERE type = 'table' AND name = 'db_info' AND "
                "sql NOT LIKE 'create virtual%'") == 0)
            return std::nullopt;
        SqliteStatement row(database,
                            "SELECT start_time, end_time, log_count, device FROM db_info WHERE id = 1");
        if (error || !row.Step())
            return std::nullopt;
        archive.first = row.Number(0);
        archive.last = row.Number(1);
        archive.logs = static_cast<uint64_t>(row.Number(2));
        archive.device = row.Text(3);
    } catch (const DatabaseError &) {
        return std::nullopt;
    }
    return archive;
}

} // namespace

std::vector<Archive> ListArchives(const std::string &folder) {
    std::vector<Archive> archives;
    std::error_code error;
    for (auto file = fs::directory_iterator(folder, error); file != fs::directory_iterator();
         file.increment(error)) {
        if (std::optional<Archive> archive = ReadArchive(*file))
            archives.push_back(std::move(*archive));
    }
    if (error && error != std::errc::no_such_file_or_directory)
        throw OutputError(folder + ": " + error.message());
    std::sort(archives.begin(), archives.end(), [](const Archive &one, const Archive &other) {
        return std::tie(one.last, one.name) < std::tie(other.last, other.name);
    });
    return archives;
}

std::vector<Archive> Expired(const std::vector<Archive> &archives, const Retention &retention) {
    uint64_t total = 0;
    for (const Archive &archive : archives)
        total += archive.bytes;
    std::vector<Archive> expired;
    for (const Archive &archive : archives) {
        const bool isTooOld = retention.since && archive.last > 0 && archive.last < *retention.since;
        const bool isTooMuch = retention.bytes && total > *retention.bytes;
        if (archive.name == retention.spared || !(isTooOld || isTooMuch))
            continue;
        total -= archive.bytes;
        expired.push_back(archive);
    }
    return expired;
}

uint64_t ParseSize(const std::string &option, const std::string &text) {
    uint64_t number = 0;
    const auto [stop, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    std::string_view unit(stop, text.data() + text.size());
    const size_t power = unit.empty() ? 0 : kUnits.find(unit.front()) + 1; // 0 also for an unknown one
    const std::string_view rest = power > 0 ? unit.substr(1) : unit;
    const bool isUnit = rest.empty() || (power > 0 && (rest == "iB" || rest == "B"));
    const uint64_t bytes = number << 10 * power;
    if (error != std::errc() || !isUnit || number == 0 || bytes >> 10 * power != number)
        throw UsageError(option + ": '" + text + "' is not a size; write for example 500M or 10G");
    return bytes;
}

std::string FormatSize(uint64_t bytes) {
    if (bytes < 1024)
        return std::to_string(bytes) + " B";
    auto number = static_cast<double>(bytes) / 1024;
    size_t unit = 0;
    for (; number >= 1024 && unit + 1 < kUnits.size(); ++unit)
        number /= 1024;
    char text[32];
    std::snprintf(text, sizeof text, "%.1f %ciB", number, kUnits[unit]);
    return text;
}

} // namespace kelo::tool
