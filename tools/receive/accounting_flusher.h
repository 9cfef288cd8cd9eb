#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "kelosyslog/accounting.h"
#include "receive/device_names.h"

namespace kelo::tool {

// Counts records for their hosts, and closes samples and flushes at the right times. While the accounting
// database cannot be written, samples wait in memory: those of a day at most, then the oldest are discarded.
// The totals of the devices stay complete.
//
// Times are seconds of any clock that does not go back.
class AccountingFlusher {
public:
    // `path` is that of the accounting database; `onSample` gets the number of records of each sample, about
    // once a second. No more than `deviceLimit` devices are counted each by its name.
    AccountingFlusher(std::string path, size_t deviceLimit, std::function<void(uint64_t)> onSample);

    void Count(const std::string &host) {
        isIdle_ = false;
        manager_->LogInc(names_.NameFor(host));
    }

    // How a caller that knows how far it has counted keeps that with the counts. A flush then happens only
    // when all counts belong to closed samples, so Tick has to be called before the first record of a second.
    struct Hooks {
        std::function<std::vector<std::string>()> statements; // run in the transaction of a flush
        std::function<void()> onFlushed;
    };
    void HooksSet(Hooks hooks);

    const std::string &Path() const { return path_; }

    // Records that were not counted for their host but as DeviceNames::kOthers.
    uint64_t Others() const { return names_.Others(); }

    // Forgets, soon, the devices that were removed from the database by ForgetDevices.
    void Reload() {
        isReloadDue_ = true;
        isIdle_ = false;
        nextFlush_ = 0;
    }

    // Call it about once a second, unless idle. Closes the sample, and flushes when its time has come.
    void Tick(int64_t now);

    // Whether all counts have been written.
    bool IsIdle() const { return isIdle_; }

    // Closes the last sample and flushes. Returns false when it must be called again: the second has not
    // changed yet, or the flush failed, which is reported once.
    bool Finish();

    // Whether the last flush failed.
    bool IsFailing() const { return isFailing_; }

private:
    bool Flush();
    void Load();
    void MakeManager();

    std::string path_;
    std::function<void(uint64_t)> onSample_;
    Hooks hooks_;
    DeviceNames names_;
    std::optional<AccountingManager> manager_;
    bool isReloadDue_ = true;
    int64_t nextFlush_ = 0;
    bool isFailing_ = false;
    bool isIdle_ = true;
};

} // namespace kelo::tool
