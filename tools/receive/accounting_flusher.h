#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "kelosyslog/accounting.h"

namespace kelo::tool {

// Counts records, and closes samples and flushes at the right times. While the accounting database cannot be
// written, samples wait in memory: those of a day at most, then the oldest are discarded. The totals of the
// devices stay complete.
//
// Times are seconds of any clock that does not go back.
class AccountingFlusher {
public:
    AccountingFlusher();

    // The accounting database keeps a name up to its first NUL.
    void Count(const std::string &host) {
        isIdle_ = false;
        const char *name = host.c_str();
        manager_->LogInc(name);
    }

    // Call it about once a second, unless idle. Closes the sample, and flushes when its time has come.
    void Tick(int64_t now);

    // Whether all counts have been written, and no reload is requested.
    bool IsIdle() const { return isIdle_ && !mustReload_; }

    // Requests that the rules are reloaded, which needs a new manager: the present one must have written all
    // its counts.
    void RequestReload();

    // Executes the request, if there is one. Returns false while no record may be counted because of it:
    // until the second has changed, so that the open sample can be closed. A failed flush postpones it to the
    // next.
    bool MayCount();

    // Closes the last sample and flushes. Returns false when it must be called again: the second has not
    // changed yet, or the flush failed, which is reported once.
    bool Finish();

    // Whether the last flush failed.
    bool IsFailing() const { return isFailing_; }

private:
    bool CloseSample();
    bool Flush();
    void Replace();

    std::unique_ptr<AccountingManager> manager_;
    int64_t nextFlush_ = 0;
    bool isFailing_ = false;
    bool isIdle_ = true;
    bool mustReload_ = false;
    bool isReloadPutOff_ = false;
};

} // namespace kelo::tool
