#include "receive/receiver.h"

#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <numeric>
#include <system_error>
#include <thread>

#include "kelosyslog/logger.h"
#include "receive/complete_databases.h"
#include "receive/loop_time.h"
#include "receive/receiver_names.h"

namespace kelo::tool {
namespace {

constexpr int kWarning = 1; // the level of an event

constexpr int64_t kSilenceMs = 1000;     // after a signal to stop, this is the end of the input
constexpr int64_t kFinishMs = 20'000;    // for storing and flushing at the end
constexpr int64_t kLeastFinishMs = 2000; // of it, if waiting for the database has taken the time before
constexpr std::chrono::milliseconds kFinishFlush{2000}; // between flushes that fail and are reported

std::string FolderOf(const ReceiverOptions &options) {
    if (options.database.empty())
        return options.root + kLogFolder;
    return std::filesystem::absolute(options.database).parent_path().string();
}

} // namespace

bool TellOtherDevices(const ReceiverOptions &options, uint64_t others) {
    if (others == 0)
        return false;
    const std::string text = "Records of more than " + std::to_string(options.deviceLimit) +
                             " devices were received; those of further ones are counted as " +
                             DeviceNames::kOthers + ".";
    return Logger().LogAdd(options.root + kEventDatabase, kWarning, "SYSTEM", text) == 0;
}

Receiver::Receiver(ReceiverOptions options)
    : options_(std::move(options)), rules_(options_.notifyLimit),
      accounting_(options_.root + kLogFolder + "/.KELOACCOUNTDB", options_.deviceLimit,
                  [this](uint64_t records) { rules_.CheckEps(records, now_ / kSecondMs); }),
      volume_(options_.root, FolderOf(options_)),
      setAside_(options_.setAside.empty() ? options_.root + kLogFolder + "/set-aside.log"
                                          : options_.setAside),
      lines_(LogStream::kMaxLineBytes),
      import_([this](const LineReader &reader,
                     const std::string &reason) { setAside_.Add(reason, reader.Line()); },
              true) {
    if (!options_.database.empty())
        writer_.emplace(options_.database, volume_);
    state_.pid = getpid();
    state_.started = std::time(nullptr);
    state_.database = writer_ ? writer_->Path() : "";
}

std::vector<EventSource> Receiver::AddSignals() {
    const auto stop = [this] { stopTime_ = stopTime_.value_or(NowMs()); };
    std::vector<EventSource> sources;
    sources.push_back(loop_.AddSignal(SIGTERM, stop));
    sources.push_back(loop_.AddSignal(SIGINT, stop));
    sources.push_back(loop_.AddSignal(SIGHUP, [this] { Reload(); }));
    return sources;
}

void Receiver::Run(int input) {
    now_ = NowMs();
    stateTime_ = now_;
    CompleteDatabases(options_.root);
    Logger().LogAddServStart(kReceiverName);
    try {
        ReceiveUntilEnd(input);
    } catch (const std::system_error &) {
        Finish();
        throw;
    }
    Finish();
}

void Receiver::ReceiveUntilEnd(int input) {
    BlockReader blocks(input);
    EventSource source = loop_.AddInput(input, [&] { Read(blocks); });
    FireAt(secondTimer_, now_);
    FireAt(stateTimer_, now_);
    while (!hasInputEnded_) {
        const bool mayRead = Advance();
        if (!mayRead || !isReading_)
            silentSince_ = now_;
        isReading_ = mayRead;
        if (HasEnded(blocks))
            break;
        source.SetEnabled(isReading_);
        loop_.Wait();
    }
    lines_.End();
    import_.Run(lines_, *this);
}

void Receiver::Read(BlockReader &input) {
    now_ = NowMs();
    silentSince_ = now_;
    const std::string_view bytes = input.Read();
    hasInputEnded_ = bytes.empty();
    lines_.Feed(bytes);
    import_.Run(lines_, *this);
}

void Receiver::Take(_SYSLOG_LOG_DATA_tag &log) {
    accounting_.Count(log.host);
    rules_.Check(log, now_ / kSecondMs);
    if (writer_)
        writer_->Take(log, now_);
}

// The work after each event. Returns whether more may be read.
bool Receiver::Advance() {
    now_ = NowMs();
    const bool isStored = !writer_ || writer_->Advance(now_);
    if (writer_ && writer_->Reason() != state_.waiting)
        TickState();
    if (writer_ && writer_->NextTime() != INT64_MAX)
        FireAt(writerTimer_, writer_->NextTime());
    if (!isTicking_ && !IsIdle()) {
        isTicking_ = true;
        FireAt(secondTimer_, now_ + kSecondMs);
    }
    return isStored;
}

bool Receiver::HasEnded(const BlockReader &input) const {
    if (!stopTime_)
        return false;
    // Events that arrived during longer work have not been handled yet.
    return (now_ - std::max(silentSince_, *stopTime_) >= kSilenceMs && !input.HasInput()) ||
           (writer_ && !writer_->Reason().empty() && now_ - *stopTime_ >= kFinishMs);
}

void Receiver::Reload() {
    now_ = NowMs();
    syslog(LOG_INFO, "files are reopened and rules loaded anew");
    if (writer_) {
        writer_->Advance(now_, true);
        writer_->Reopen();
    }
    setAside_.Reopen();
    rules_.Reload();
    accounting_.Reload();
}

// Whether there is no work every second until the next event.
bool Receiver::IsIdle() const {
    return !stopTime_ && accounting_.IsIdle() && rules_.IsIdle() && !rules_.IsFailing() && setAside_.IsIdle();
}

void Receiver::TickSecond() {
    now_ = NowMs();
    const int64_t next = now_ + kSecondMs;
    accounting_.Tick(now_ / kSecondMs);
    rules_.Tick(now_ / kSecondMs);
    setAside_.Tick(now_ / kSecondMs);
    volume_.Tick();
    Repair();
    isTicking_ = !IsIdle();
    if (isTicking_)
        FireAt(secondTimer_, next);
}

void Receiver::TickState() {
    now_ = NowMs();
    volume_.Tick();
    if (!areOthersTold_) // one event, however long the flood of names lasts
        areOthersTold_ = TellOtherDevices(options_, accounting_.Others());
    WriteState();
    if (writer_)
        index_.Tick(writer_->Path(), writer_->Stored());
    FireAt(stateTimer_, now_ + kBeatMs);
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
    state_.lostNotifications = rules_.Lost();
    state_.others = accounting_.Others();
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
        std::this_thread::sleep_for(kFinishRetry);
    if (writer_ && writer_->Waiting() > 0)
        syslog(LOG_ERR, "%zu logs are lost, and those not read yet: %s", writer_->Waiting(),
               writer_->Reason().c_str());
    bool isFlushed = accounting_.Finish();
    while (!isFlushed && !isOver()) {
        if (accounting_.IsFailing())
            CompleteDatabases(options_.root);
        std::this_thread::sleep_for(accounting_.IsFailing() ? kFinishFlush : kFinishRetry);
        isFlushed = accounting_.Finish();
    }
    if (!isFlushed)
        syslog(LOG_ERR, "the counts since the last flush of the accounting are lost");
    rules_.Finish();
    setAside_.Finish();
    Logger().LogAddServStop(kReceiverName);
    state_.ended = std::time(nullptr);
    now_ = NowMs();
    WriteState();
}

} // namespace kelo::tool
