#pragma once

#include <cstdint>
#include <functional>
#include <string>

#include "kelosyslog/accounting.h"

namespace kelo::tool {

// Counts records for their hosts, and closes samples and flushes at the right times. While the accounting
// database cannot be written, samples wait in memory: those of a day at most, then the oldest are discarded.
// The totals of the devices stay complete.
//
// Times are seconds of any clock that does not go back.
class AccountingFlusher {
public:
    // `onSample` gets the number of records of each sample, about once a second.
    explicit AccountingFlusher(std::function<void(uint64_t)> onSample);

    // The accounting database keeps a name up to its first NUL.
    void Count(const std::string &host) {
        isIdle_ = false;
        const char *name = host.c_str();
        manager_.LogInc(name);
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

    AccountingManager manager_;
    int64_t nextFlush_ = 0;
    bool isFailing_ = false;
    bool isIdle_ = true;
};

} // namespace kelo::tool
