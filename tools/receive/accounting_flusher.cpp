#include "receive/accounting_flusher.h"

#include <syslog.h>

#include <algorithm>
#include <chrono>
#include <utility>

#include "base/errors.h"
#include "receive/complete_databases.h"
#include "store/forgotten_devices.h"

namespace kelo::tool {
namespace {

// The manager requires six seconds between two questions, by its clock; seven of ours are at least that many.
constexpr int64_t kFlushSec = 7;
// A flush that waits for a locked database takes seconds, and so does one of millions of devices. Nothing is
// received meanwhile, so it may take up to a tenth of the time.
constexpr int64_t kPausePerFlush = 9;
// One that keeps failing is reported every time.
constexpr int64_t kFlushWhileFailingSec = 60;
constexpr size_t kMostSamples = 24 * 60 * 60;
constexpr size_t kMostCounts = 1'000'000;

} // namespace

AccountingFlusher::AccountingFlusher(std::string path, size_t deviceLimit,
                                     std::function<void(uint64_t)> onSample)
    : path_(std::move(path)), onSample_(std::move(onSample)), names_(deviceLimit) {
    Load();
}

// Only while no count is waiting.
void AccountingFlusher::Load() {
    bool isChanged = false;
    try {
        isChanged = DropForgottenDevices(path_);
        isReloadDue_ = false;
    } catch (const DatabaseError &error) {
        syslog(LOG_WARNING, "devices are not forgotten yet: %s", error.what());
    }
    if (manager_ && !isChanged)
        return;
    try {
        PutAsideIfItHasViews(path_);
    } catch (const DatabaseError &error) {
        if (!manager_)
            throw;
        syslog(LOG_ERR, "devices are not forgotten: %s", error.what());
        return;
    }
    MakeManager();
    names_.Load(manager_->HistogramGet());
}

void AccountingFlusher::MakeManager() {
    manager_.emplace();
    manager_->EpsHandlerSet(onSample_);
    manager_->FlushStatementsSet(hooks_.statements);
}

void AccountingFlusher::HooksSet(Hooks hooks) {
    hooks_ = std::move(hooks);
    manager_->FlushStatementsSet(hooks_.statements);
}

void AccountingFlusher::Tick(int64_t now) {
    manager_->CurEpsUpdate();
    if (now < nextFlush_ || (hooks_.statements && manager_->CurrentEpsGet() != 0))
        return;
    nextFlush_ = now + kFlushSec;
    // False when its clock was set back: the next answer is right again.
    if (!manager_->isNeed2Flush() && !isReloadDue_)
        return;
    using Clock = std::chrono::steady_clock;
    const Clock::time_point begin = Clock::now();
    const bool wasFailing = isFailing_;
    const bool isStillFailing = !Flush() && wasFailing;
    const auto sec = std::chrono::duration_cast<std::chrono::seconds>(Clock::now() - begin).count();
    nextFlush_ =
        now + std::max(isStillFailing ? kFlushWhileFailingSec : kFlushSec, sec + sec * kPausePerFlush);
    if (isReloadDue_ && isIdle_)
        Load();
    else if (isReloadDue_ && !isFailing_)
        nextFlush_ = now + 1;
}

bool AccountingFlusher::Finish() {
    manager_->CurEpsUpdate();
    return manager_->CurrentEpsGet() == 0 && Flush();
}

bool AccountingFlusher::Flush() {
    const bool isFlushed = manager_->AccoutingFlush2DB() == 0;
    if (!isFlushed) {
        if (const size_t dropped = manager_->SamplesDrop(kMostSamples, kMostCounts); dropped > 0)
            syslog(LOG_ERR, "%zu samples of the accounting were given up, as it cannot be written", dropped);
        if (!isFailing_)
            syslog(LOG_ERR, "the accounting cannot be written and waits in memory");
    } else if (isFailing_) {
        syslog(LOG_NOTICE, "the accounting has been written");
    }
    if (isFlushed && hooks_.onFlushed)
        hooks_.onFlushed();
    isFailing_ = !isFlushed;
    isIdle_ = isFlushed && manager_->CurrentEpsGet() == 0;
    return isFlushed;
}

} // namespace kelo::tool
