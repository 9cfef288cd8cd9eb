#include "receive/receiver.h"

#include <poll.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <numeric>
#include <system_error>

#include "kelosyslog/logger.h"
#include "receive/complete_databases.h"

namespace kelo::tool {
namespace {

constexpr const char *kEventText = "kelosyslog receive";
constexpr const char *kFolder = "/var/log/kelolog";

constexpr int64_t kSecondMs = 1000;
constexpr int64_t kBeatMs = 6000;
constexpr int64_t kRepairMs = 60'000;
constexpr int64_t kHoldMs = 20;          // between looks at the clock while no log may be counted
constexpr int64_t kSilenceMs = 1000;     // after a signal to stop, this is the end of the input
constexpr int64_t kFinishMs = 20'000;    // for storing and flushing at the end
constexpr int64_t kLeastFinishMs = 2000; // of it, where waiting for the database has taken the time before
constexpr int64_t kFinishRetryMs = 200;
constexpr int64_t kFinishFlushMs = 2000; // between flushes that fail, of which each is reported

std::string FolderOf(const ReceiverOptions &options) {
    if (options.database.empty())
        return options.root + kFolder;
    return std::filesystem::absolute(options.database).parent_path().string();
}

} // namespace

Receiver::Receiver(ReceiverOptions options)
    : options_(std::move(options)), volume_(FolderOf(options_)),
      setAside_(options_.setAside.empty() ? options_.root + kFolder + "/set-aside.log" : options_.setAside),
      rules_(options_.notifyLimit),
      import_([this](const LineReader &reader,
                     const std::string &reason) { setAside_.Add(reason, reader.Line()); },
              true) {
    if (!options_.database.empty())
        writer_.emplace(options_.database, volume_);
    state_.pid = getpid();
    state_.started = std::time(nullptr);
    state_.database = writer_ ? writer_->Path() : "";
}

int64_t Receiver::NowMs() {
    return std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now().time_since_epoch()).count();
}

void Receiver::Run(int input) {
    input_ = input;
    now_ = NowMs();
    stateTime_ = now_;
    CompleteDatabases(options_.root);
    Logger().LogAddServStart(kEventText);
    LineReader reader(input, LogStream::kMaxLineBytes);
    try {
        import_.Run(reader, *this);
    } catch (const std::system_error &) {
        Finish();
        throw;
    }
    Finish();
}

void Receiver::Take(_SYSLOG_LOG_DATA_tag &log) {
    accounting_.Count(log.host);
    rules_.Check(log, now_ / kSecondMs);
    if (writer_)
        writer_->Take(log, now_);
}

bool Receiver::AwaitInput(const LineReader &) {
    isInputReady_ = false;
    for (;;) {
        now_ = NowMs();
        HandleSignals();
        Tick();
        const bool isStored = !writer_ || writer_->Advance(now_);
        const bool mayRead = accounting_.MayCount() && isStored;
        if (mayRead && isInputReady_)
            return true;
        if (HasEnded())
            return false;
        Wait(mayRead);
    }
}

// Until there is input, where that may be read, or a signal, or something to do.
void Receiver::Wait(bool mayRead) {
    int64_t next = std::min(nextSecond_, nextTick_);
    if (writer_)
        next = std::min(next, writer_->NextTime());
    if (!mayRead && (!writer_ || writer_->Reason().empty()))
        next = std::min(next, now_ + kHoldMs);
    pollfd waiting[] = {{signals_.Fd(), POLLIN, 0}, {mayRead ? input_ : -1, POLLIN, 0}};
    poll(waiting, 2, static_cast<int>(std::max<int64_t>(next - now_, 0)));
    isInputReady_ = waiting[1].revents != 0;
    if (isInputReady_ || !mayRead)
        silentSince_ = NowMs();
}

bool Receiver::HasEnded() const {
    if (!stopTime_)
        return false;
    return now_ - std::max(silentSince_, *stopTime_) >= kSilenceMs ||
           (writer_ && !writer_->Reason().empty() && now_ - *stopTime_ >= kFinishMs);
}

void Receiver::HandleSignals() {
    while (const std::optional<int> signal = signals_.Take()) {
        if (*signal != SIGHUP) {
            stopTime_ = stopTime_.value_or(now_);
            continue;
        }
        syslog(LOG_INFO, "files are reopened and rules loaded anew");
        if (writer_) {
            writer_->Advance(now_, true);
            writer_->Reopen();
        }
        setAside_.Reopen();
        rules_.Reload();
        accounting_.RequestReload();
    }
}

void Receiver::Tick() {
    if (now_ >= nextSecond_) {
        nextSecond_ = now_ + kSecondMs;
        accounting_.Tick(now_ / kSecondMs);
        rules_.Tick(now_ / kSecondMs);
        setAside_.Tick(now_ / kSecondMs);
        Repair();
    }
    const bool isChanged = writer_ && writer_->Reason() != state_.waiting;
    if (now_ < nextTick_ && !isChanged)
        return;
    nextTick_ = now_ + kBeatMs;
    volume_.Tick();
    WriteState();
}

void Receiver::Repair() {
    if (now_ < nextRepair_ || (!accounting_.IsFailing() && !rules_.IsFailing()))
        return;
    nextRepair_ = now_ + kRepairMs;
    CompleteDatabases(options_.root);
}

uint64_t Receiver::Received() const {
    const ImportCounts &counts = import_.Counts();
    return std::accumulate(counts.incomplete.begin(), counts.incomplete.end(), counts.parsed,
                           [](uint64_t rest, const auto &entry) { return rest - entry.second; });
}

void Receiver::WriteState() {
    const ImportCounts &counts = import_.Counts();
    state_.updated = std::time(nullptr);
    state_.received = Received();
    state_.incomplete = counts.incomplete;
    state_.rejected = counts.tooFewFields;
    state_.overlong = counts.overlong;
    state_.suppressed = rules_.Suppressed();
    if (writer_) {
        state_.stored = writer_->Stored();
        state_.waiting = writer_->Reason();
    }
    if (now_ > stateTime_)
        state_.eps = static_cast<double>(state_.received - receivedBefore_) * kSecondMs /
                     static_cast<double>(now_ - stateTime_);
    receivedBefore_ = state_.received;
    stateTime_ = now_;
    const bool isWritten = WriteReceiverState(options_.root, state_);
    if (!isWritten && !isStateFailing_)
        syslog(LOG_WARNING, "cannot write %s: %s", ReceiverStatePath(options_.root).c_str(),
               std::strerror(errno));
    isStateFailing_ = !isWritten;
}

void Receiver::Finish() {
    now_ = NowMs();
    const int64_t deadline = std::max(stopTime_.value_or(now_) + kFinishMs, now_ + kLeastFinishMs);
    const auto isOver = [&] { return (now_ = NowMs()) >= deadline; };
    while (writer_ && !isOver() && !writer_->Advance(now_, true))
        poll(nullptr, 0, kFinishRetryMs);
    if (writer_ && writer_->Waiting() > 0)
        syslog(LOG_ERR, "%zu logs are lost, and those not read yet: %s", writer_->Waiting(),
               writer_->Reason().c_str());
    bool isFlushed = accounting_.Finish();
    while (!isFlushed && !isOver()) {
        if (accounting_.IsFailing())
            CompleteDatabases(options_.root);
        poll(nullptr, 0, accounting_.IsFailing() ? kFinishFlushMs : kFinishRetryMs);
        isFlushed = accounting_.Finish();
    }
    if (!isFlushed)
        syslog(LOG_ERR, "the counts since the last flush of the accounting are lost");
    rules_.Finish();
    setAside_.Finish();
    Logger().LogAddServStop(kEventText);
    state_.ended = std::time(nullptr);
    now_ = NowMs();
    WriteState();
}

} // namespace kelo::tool
