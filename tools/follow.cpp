#include "follow.h"

#include <sys/stat.h>

#include <algorithm>
#include <chrono>
#include <ctime>

namespace kelo::tool {
namespace {

using Clock = std::chrono::steady_clock;

constexpr int kPollMs = 250;

// Which file stands at a path; nothing when there is none.
struct FileIdentity {
    dev_t device;
    ino_t inode;
    bool operator==(const FileIdentity &) const = default;
};

std::optional<FileIdentity> IdentifyFile(const std::string &path) {
    struct stat status {};
    if (stat(path.c_str(), &status) != 0)
        return std::nullopt;
    return FileIdentity{status.st_dev, status.st_ino};
}

} // namespace

uint64_t Follow(const LogReader &reader, const FollowOptions &options, const LogHandler &print,
                Output &output) {
    uint64_t lastId = 0;
    const LogHandler printAndRemember = [&](const _SYSLOG_LOG_DATA_tag &log) {
        print(log);
        lastId = log.id;
    };
    std::optional<FileIdentity> file = IdentifyFile(reader.Source().path);
    // Logs that no condition selects count as seen, so that they are not read over and over.
    const LogReader everything(reader.Source(), {});
    const uint64_t newest = everything.IdFromNewest(0);
    uint64_t count = 0;
    if (options.showAll)
        count = reader.WalkPage({}, true, printAndRemember);
    else if (options.lines > 0)
        count = reader.WalkPage({options.lines, 0}, true, printAndRemember);
    lastId = std::max(lastId, newest);
    output.Flush();

    Clock::time_point lastNews = Clock::now();
    while (true) {
        // Taken before the look, so that a log of the last second is not missed.
        const bool isOver = options.until && std::time(nullptr) > *options.until;
        const std::optional<FileIdentity> current = IdentifyFile(reader.Source().path);
        if (current && file != current)
            lastId = 0;
        uint64_t news = 0;
        if (current) {
            file = current;
            const uint64_t seen = everything.IdFromNewest(0);
            if (seen > lastId) {
                news = reader.Walk({lastId + 1, seen}, true, 0, printAndRemember);
                lastId = seen;
            }
        }
        output.Flush();
        count += news;
        if (news > 0)
            lastNews = Clock::now();
        const bool isIdle =
            options.idleSec && Clock::now() - lastNews >= std::chrono::seconds(*options.idleSec);
        if (isOver || (isIdle && news == 0))
            return count;
        output.Wait(kPollMs);
    }
}

} // namespace kelo::tool
