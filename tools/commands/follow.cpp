#include "commands/follow.h"

#include <sys/stat.h>

#include <algorithm>
#include <chrono>
#include <ctime>
#include <set>

#include "base/errors.h"
#include "keloplatform/cluster.h"

namespace kelo::tool {
namespace {

using Clock = std::chrono::steady_clock;

constexpr int kPollMs = 250;
// How late a record of a cluster may come, in ids: ten seconds.
constexpr uint64_t kLateIds = uint64_t{10} << KELODB_CLUSTER_BITS_BELOW_SECOND;

class Follower {
public:
    Follower(const LogReader &reader, const LogHandler &format, const ChunkHandler &print)
        : reader_(reader), everything_(reader.Table(), {}), format_(format), print_(print) {}

    uint64_t PrintPresent(const FollowOptions &options) {
        file_ = IdentifyFile(reader_.Table().path);
        lastId_ = everything_.IdFromNewest(0);
        if (isCluster_)
            NoteLateOnes();
        if (!options.showAll && options.lines == 0)
            return 0;
        const auto format = [this](const _SYSLOG_LOG_DATA_tag &log) {
            if (isCluster_)
                seen_.insert(log.id);
            format_(log);
            lastId_ = std::max(lastId_, log.id);
        };
        const Page page{options.showAll ? 0 : options.lines, 0, {.first = options.firstId}};
        return reader_.ReadPage(page, true, format, print_);
    }

    uint64_t PrintNews() {
        if (isCluster_)
            return PrintNewsOfCluster();
        const std::optional<FileIdentity> current = IdentifyFile(reader_.Table().path);
        if (!current)
            return 0;
        const bool isReplaced = current != file_;
        const uint64_t first = isReplaced ? 1 : lastId_ + 1;
        try {
            // Records that are not selected count as seen too, so that they are not read again and again.
            const uint64_t newest = everything_.IdFromNewest(0);
            file_ = current;
            lastId_ = isReplaced ? newest : std::max(lastId_, newest);
            return newest < first ? 0 : reader_.Scan({first, newest}, true, 0, format_, print_);
        } catch (const DatabaseError &) {
            const bool hasNoTableYet = isReplaced && file_ != current;
            const bool isReplacedNow = IdentifyFile(reader_.Table().path) != current;
            if (!hasNoTableYet && !isReplacedNow)
                throw;
            return 0;
        }
    }

private:
    // From here on records of other servers may still arrive.
    uint64_t FirstLateId() const { return lastId_ > kLateIds ? lastId_ - kLateIds : 1; }

    void NoteLateOnes() {
        reader_.Scan({FirstLateId(), lastId_}, true, 0,
                     [this](const _SYSLOG_LOG_DATA_tag &log) { seen_.insert(log.id); });
    }

    // The last seconds are read again, for what came late.
    uint64_t PrintNewsOfCluster() {
        uint64_t count = 0;
        const auto format = [&](const _SYSLOG_LOG_DATA_tag &log) {
            if (!seen_.insert(log.id).second)
                return;
            format_(log);
            ++count;
        };
        const uint64_t newest = everything_.IdFromNewest(0);
        if (newest != 0)
            reader_.Scan({FirstLateId(), newest}, true, 0, format, print_);
        lastId_ = std::max(lastId_, newest);
        seen_.erase(seen_.begin(), seen_.lower_bound(FirstLateId()));
        return count;
    }

    const LogReader &reader_;
    LogReader everything_;
    const LogHandler &format_;
    const ChunkHandler &print_;
    std::optional<FileIdentity> file_; // the one that was read last
    uint64_t lastId_ = 0;
    const bool isCluster_ = KELODBIsCluster(reader_.Table().path.c_str()) != 0;
    std::set<uint64_t> seen_; // selected records of a cluster that may be read again
};

} // namespace

std::optional<FileIdentity> IdentifyFile(const std::string &path) {
    struct stat status {};
    if (stat(path.c_str(), &status) != 0)
        return std::nullopt;
    return FileIdentity{status.st_dev, status.st_ino};
}

uint64_t RepeatUntilOver(const FollowOptions &options, const std::function<uint64_t()> &printNews,
                         Output &output) {
    uint64_t count = 0;
    Clock::time_point lastNews = Clock::now();
    while (true) {
        // Read before the query, so that no record of the last second is missed.
        const bool isOver = options.until && std::time(nullptr) > *options.until;
        const uint64_t news = printNews();
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

uint64_t Follow(const LogReader &reader, const FollowOptions &options, const LogHandler &format,
                const ChunkHandler &print, Output &output) {
    Follower follower(reader, format, print);
    const uint64_t present = follower.PrintPresent(options);
    output.Flush();
    return present + RepeatUntilOver(
                         options, [&] { return follower.PrintNews(); }, output);
}

} // namespace kelo::tool
