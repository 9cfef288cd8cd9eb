#include "receive/spool_receiver.h"

#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <iterator>
#include <system_error>
#include <thread>

#include "base/folder.h"
#include "kelosyslog/logger.h"
#include "receive/complete_databases.h"
#include "receive/loop_time.h"
#include "receive/receiver_names.h"
#include "receive/spool_report.h"

namespace kelo::tool {
namespace {

// Between two turns: each commit costs as much as some hundred rows, and a message waits half of it.
constexpr int64_t kTurnMs = 40;
// Behind, larger batches write fewer pages of the indexes twice.
constexpr size_t kBatchRows = 20'000;
constexpr int64_t kLoadRetryMs = 1000;
constexpr int64_t kFinishSpoolMs = 10'000; // for storing and flushing at the end
// Half a record at the end of a file that has not changed for so long gets no second half. A writer that
// waits for room on the disk may take long.
constexpr int64_t kPartialSec = 600;
constexpr int64_t kForgetReceiptsSec = 600;

std::string FolderOf(const std::string &database) {
    return std::filesystem::absolute(database).parent_path().string();
}

} // namespace

SpoolReceiver::SpoolReceiver(ReceiverOptions options)
    : options_(std::move(options)), rules_(options_.notifyLimit),
      accounting_(options_.root + kLogFolder + "/.KELOACCOUNTDB", options_.deviceLimit,
                  [](uint64_t) {}), // the rules count for themselves
      volume_(options_.root, FolderOf(options_.database)),
      setAside_(options_.setAside.empty() ? options_.root + kLogFolder + "/set-aside.log"
                                          : options_.setAside),
      writer_(options_.database, volume_, kBatchRows), folder_(options_.spool + "/files") {
    writer_.HooksSet({.alongside = [this](SqliteConnection &database) { Save(database); },
                      .onStored =
                          [this](std::span<const _SYSLOG_LOG_DATA_tag> logs) {
                              MarkSaved(SpoolReader::kRows);
                              isSaveDue_ = false;
                              Count(logs);
                          }});
    rules_.Hold(options_.root + kEventDatabase);
    accounting_.HooksSet(
        {.statements =
             [this] { return PlaceStatements(SpoolReader::kCounts, PlacesOf(SpoolReader::kCounts)); },
         .onFlushed = [this] { MarkSaved(SpoolReader::kCounts); }});
    state_.pid = getpid();
    state_.started = std::time(nullptr);
    state_.database = writer_.Path();
}

std::vector<EventSource> SpoolReceiver::AddSignals() {
    const auto stop = [this] { mustEnd_ = true; };
    std::vector<EventSource> sources;
    sources.push_back(loop_.AddSignal(SIGTERM, stop));
    sources.push_back(loop_.AddSignal(SIGINT, stop));
    sources.push_back(loop_.AddSignal(SIGHUP, [this] { Reload(); }));
    return sources;
}

void SpoolReceiver::Run() {
    now_ = NowMs();
    stateTime_ = now_;
    CompleteDatabases(options_.root);
    Logger().LogAddServStart(kReceiverName);
    EventSource changes = loop_.AddInput(folder_.Changes(), [this, &changes] {
        haveNamesChanged_ = folder_.Drain() || haveNamesChanged_;
        hasNews_ = true;
        changes.SetEnabled(false); // what comes until the next turn is found in it
    });
    FireAt(secondTimer_, now_);
    FireAt(stateTimer_, now_);
    loop_.NotifyServiceManager();
    while (!mustEnd_) {
        now_ = NowMs();
        Work();
        changes.SetEnabled(!hasNews_);
        loop_.Wait();
    }
    Finish();
}

// ---- Places ----

// Where the readers had got. A database that cannot be read now may be readable soon; a missing or damaged
// one has no places.
bool SpoolReceiver::LoadAll() {
    loaded_.clear();
    std::string problem = TryLoad(writer_.Path(), [this](SqliteConnection &database) {
        loaded_[SpoolReader::kRows] = LoadPlaces(database, SpoolReader::kRows);
        rules_.MemorySet(LoadRuleMemory(database, now_ / kSecondMs), now_ / kSecondMs);
    });
    const std::string reason = TryLoad(accounting_.Path(), [this](SqliteConnection &database) {
        loaded_[SpoolReader::kCounts] = LoadPlaces(database, SpoolReader::kCounts);
    });
    if (problem.empty())
        problem = reason;
    if (!problem.empty() && state_.waiting != problem)
        syslog(LOG_ERR, "receiving waits, as it is not known what was received before: %s", problem.c_str());
    state_.waiting = problem;
    return problem.empty();
}

void SpoolReceiver::Restore(SpoolFile &file) {
    for (const auto &[reader, places] : loaded_) {
        for (const SpoolPlace &place : places) {
            if (place.inode == file.inode)
                file.Restore(reader, place);
        }
    }
    if (file.IsDone())
        file.position = file.size;
    hasNews_ = true;
}

SpoolReceiver::Places SpoolReceiver::PlacesOf(SpoolReader reader) const {
    Places places;
    for (const auto &file : folder_.Files()) {
        if (SpoolPlace place = file->Place(reader); place.offset > 0)
            places.push_back(std::move(place));
    }
    // Of files that wait for their turn to be opened.
    if (const auto loaded = loaded_.find(reader); loaded != loaded_.end() && !folder_.AreAllOpen()) {
        std::copy_if(loaded->second.begin(), loaded->second.end(), std::back_inserter(places),
                     [this](const SpoolPlace &place) { return folder_.Find(place.inode) == nullptr; });
    }
    return places;
}

void SpoolReceiver::MarkSaved(SpoolReader reader) {
    for (const auto &file : folder_.Files())
        file->Of(reader).saved = file->Of(reader).offset;
}

// The reader has everything that was read.
void SpoolReceiver::Advance(SpoolReader reader) {
    for (const auto &file : folder_.Files())
        file->Of(reader).offset = std::max(file->Of(reader).offset, file->position);
}

// The rows of this transaction are up to the position of their files, and so far the rules are checked.
void SpoolReceiver::Save(SqliteConnection &database) {
    Advance(SpoolReader::kRows);
    for (const std::string &statement : PlaceStatements(SpoolReader::kRows, PlacesOf(SpoolReader::kRows)))
        database.Run(statement);
    SaveRuleMemory(database, rules_.Memory());
}

// Without rows: what was set aside, had come before, or was sent. Not while a batch waits, and not before the
// files are known: their places would be gone.
bool SpoolReceiver::SavePlaces() {
    isSaveDue_ = !isScanned_ || !writer_.WriteAlongside();
    if (!isSaveDue_)
        MarkSaved(SpoolReader::kRows);
    return !isSaveDue_;
}

// ---- Turns ----

void SpoolReceiver::Work() {
    if (!isLoaded_ && !(isLoaded_ = LoadAll())) {
        FireAt(turnTimer_, now_ + kLoadRetryMs);
        return;
    }
    if (!StoreWaiting()) {
        FireAt(turnTimer_, writer_.NextTime());
        return;
    }
    if (hasNews_ && now_ >= nextTurn_)
        Turn();
    if (hasNews_)
        FireAt(turnTimer_, nextTurn_);
}

// Whether the last batch is in the database.
bool SpoolReceiver::StoreWaiting() {
    const bool isStored = writer_.Waiting() == 0 || writer_.Advance(now_, true);
    if (isStored && isScanned_)
        rules_.Deliver(now_ / kSecondMs, [this] { return SavePlaces(); });
    if (writer_.Reason() != state_.waiting)
        TickState();
    return isStored;
}

void SpoolReceiver::Turn() {
    haveNamesChanged_ = folder_.Drain() || haveNamesChanged_;
    if (haveNamesChanged_)
        folder_.Scan([this](SpoolFile &file) { Restore(file); });
    else
        folder_.Refresh();
    haveNamesChanged_ = false;
    isScanned_ = true;
    hasNews_ = Fill();
    nextTurn_ = hasNews_ ? now_ : now_ + kTurnMs;
    if (again_.Size() > 0) {
        Count(again_.Records());
        again_.Clear();
    } else if (!sources_.empty()) {
        CheckRules();
        StoreWaiting();
    }
}

// Reads a batch. Returns whether there is more.
bool SpoolReceiver::Fill() {
    sources_.clear();
    for (const auto &file : folder_.Files()) {
        if (!file->isForeign && file->position < file->size && ReadFile(*file))
            return true;
    }
    return false;
}

// Returns whether the batch should be written before more is read.
bool SpoolReceiver::ReadFile(SpoolFile &file) {
    for (;;) {
        // A batch is either to be stored or stored already.
        const uint64_t stored = file.Of(SpoolReader::kRows).offset;
        if (file.position == stored ? again_.Size() > 0 : writer_.Waiting() > 0 && file.position < stored)
            return true;
        const uint64_t before = file.position;
        const std::string_view bytes = file.Read(buffer_, file.position < stored ? stored : file.size);
        Take(file, bytes);
        if (IsBatchFull())
            return true;
        if (file.position == before && !GiveUpPartial(file, bytes))
            return false;
    }
}

void SpoolReceiver::Take(SpoolFile &file, std::string_view bytes) {
    while (!bytes.empty() && !IsBatchFull()) {
        _SYSLOG_LOG_DATA_tag &log = writer_.Next();
        const SpoolParser::Piece piece = file.parser.Parse(bytes, log);
        file.isForeign = piece == SpoolParser::Piece::kForeign;
        if (file.isForeign || piece == SpoolParser::Piece::kPartial)
            break;
        const size_t size = file.parser.Size();
        const uint64_t end = file.position + size;
        const bool isNew = end > file.Of(SpoolReader::kRows).offset;
        if (piece == SpoolParser::Piece::kGarbage) {
            if (isNew)
                PutAside(file, "no record", bytes.substr(0, size));
        } else if (!file.receipts.Has(file.parser.Receipt(), bytes.substr(0, size))) {
            TakeRecord(file, end, log);
        }
        isSaveDue_ = isSaveDue_ || isNew;
        file.position = end;
        bytes.remove_prefix(size);
    }
}

void SpoolReceiver::TakeRecord(SpoolFile &file, uint64_t end, _SYSLOG_LOG_DATA_tag &log) {
    if (end > file.Of(SpoolReader::kRows).offset)
        writer_.Take(log, now_);
    else if (end > file.Of(SpoolReader::kCounts).offset)
        again_.Take(log);
    else
        return;
    sources_.push_back({&file, end});
}

// What a writer that was killed or a full disk has left at the end of a file. Returns whether there may be
// more behind it.
bool SpoolReceiver::GiveUpPartial(SpoolFile &file, std::string_view bytes) {
    if (file.isForeign) {
        if (!isForeignTold_)
            syslog(LOG_ERR, "%s/files/%s was written for another version of kelosyslog and stays",
                   options_.spool.c_str(), file.name.c_str());
        isForeignTold_ = true;
        return false;
    }
    if (const uint64_t stored = file.Of(SpoolReader::kRows).offset; file.position < stored) {
        file.position = stored; // an earlier run has given it up
        return true;
    }
    const bool isAll = file.position + bytes.size() == file.size && bytes.size() < SpoolFile::kBlockBytes;
    if (bytes.empty() || (isAll && std::time(nullptr) - file.modified < kPartialSec))
        return false;
    PutAside(file, "half a record", bytes);
    file.position += bytes.size();
    isSaveDue_ = true;
    return true;
}

void SpoolReceiver::PutAside(const SpoolFile &file, const char *reason, std::string_view bytes) {
    setAside_.Add(std::string(reason) + " in " + file.name + " at " + std::to_string(file.position), bytes);
    ++state_.rejected;
}

// Before the batch is stored: what the rules make of it is part of its transaction.
void SpoolReceiver::CheckRules() {
    const std::span<const _SYSLOG_LOG_DATA_tag> logs = writer_.Records();
    for (size_t i = 0; i < logs.size(); ++i) {
        if (sources_[i].file->isCounted)
            continue;
        rules_.CountForEps(logs[i].utcsec, now_ / kSecondMs);
        rules_.Check(logs[i], now_ / kSecondMs);
    }
}

// Counts the records of the batch. Those of an earlier run may be counted already.
void SpoolReceiver::Count(std::span<const _SYSLOG_LOG_DATA_tag> logs) {
    // Before the first record of a second all counts belong to closed samples, and only then are they
    // flushed.
    accounting_.Tick(now_ / kSecondMs);
    for (size_t i = 0; i < logs.size(); ++i) {
        const auto &[file, end] = sources_[i];
        if (end > file->Of(SpoolReader::kCounts).offset) {
            accounting_.Count(logs[i].host);
            file->Of(SpoolReader::kCounts).offset = end;
            ++state_.received;
        }
        lastUtc_ = logs[i].utcsec;
    }
    Advance(SpoolReader::kCounts);
}

// ---- Times ----

// For keep-spool, which removes the files.
void SpoolReceiver::TellDone() {
    std::string done;
    for (const auto &file : folder_.Files()) {
        if (!file->IsDone())
            continue;
        done += std::to_string(file->inode) + " " + std::to_string(file->size) + " " + file->name + "\n";
        if (std::time(nullptr) - file->modified > kForgetReceiptsSec)
            file->receipts.Clear();
    }
    // The rows have to outlive a loss of power before the files are removed.
    if (done != done_ && writer_.Sync() && WriteSpoolDone(options_.root, done))
        done_ = done;
}

void SpoolReceiver::TickSecond() {
    now_ = NowMs();
    FireAt(secondTimer_, now_ + kSecondMs);
    haveNamesChanged_ = true;
    hasNews_ = true;
    accounting_.Tick(now_ / kSecondMs);
    if (accounting_.IsIdle())
        MarkSaved(SpoolReader::kCounts);
    setAside_.Tick(now_ / kSecondMs);
    volume_.Tick();
    if (isLoaded_ && writer_.Waiting() == 0)
        TickRules();
    TellDone();
    if (now_ >= nextRepair_ && (accounting_.IsFailing() || rules_.IsFailing())) {
        nextRepair_ = now_ + kRepairMs;
        CompleteDatabases(options_.root);
    }
}

void SpoolReceiver::TickRules() {
    const int64_t now = now_ / kSecondMs;
    rules_.Tick(now);
    if (folder_.Unread() == 0)
        rules_.EpsTick(std::time(nullptr), now);
    Advance(SpoolReader::kCounts);
    if (isSaveDue_)
        SavePlaces();
    rules_.Deliver(now, [this] { return SavePlaces(); });
}

void SpoolReceiver::TickState() {
    now_ = NowMs();
    if (!areOthersTold_)
        areOthersTold_ = TellOtherDevices(options_, accounting_.Others());
    WriteState();
    index_.Tick(writer_.Path(), writer_.Stored());
    FireAt(stateTimer_, now_ + kBeatMs);
}

void SpoolReceiver::WriteState() {
    state_.updated = std::time(nullptr);
    state_.stored = writer_.Stored();
    state_.suppressed = rules_.Suppressed();
    state_.lostNotifications = rules_.Lost();
    state_.others = accounting_.Others();
    if (isLoaded_)
        state_.waiting = writer_.Reason();
    const uint64_t unread = folder_.Unread();
    state_.spool = {.folder = options_.spool,
                    .bytes = folder_.Bytes(),
                    .limit = SpoolLimit(options_.spool, folder_.Bytes()),
                    .unread = unread,
                    .behindSec =
                        unread > 0 && lastUtc_ > 0 ? std::max<int64_t>(state_.updated - lastUtc_, 0) : 0};
    if (now_ > stateTime_) {
        const double seconds = static_cast<double>(now_ - stateTime_) / kSecondMs;
        state_.eps = static_cast<double>(state_.received - receivedBefore_) / seconds;
        state_.spool.growth = (static_cast<double>(unread) - static_cast<double>(unreadBefore_)) / seconds;
    }
    receivedBefore_ = state_.received;
    unreadBefore_ = unread;
    stateTime_ = now_;
    const bool isWritten = WriteReceiverState(options_.root, state_);
    if (!isWritten && !isStateFailing_)
        syslog(LOG_WARNING, "cannot write %s: %s", ReceiverStatePath(options_.root).c_str(),
               std::strerror(errno));
    isStateFailing_ = !isWritten;
}

void SpoolReceiver::Reload() {
    now_ = NowMs();
    syslog(LOG_INFO, "files are reopened and rules loaded anew");
    writer_.Reopen();
    setAside_.Reopen();
    rules_.Reload();
    accounting_.Reload();
}

void SpoolReceiver::Finish() {
    now_ = NowMs();
    const int64_t deadline = now_ + kFinishSpoolMs;
    bool isFlushed = !isLoaded_ || (StoreWaiting() && accounting_.Finish());
    while (!isFlushed && (now_ = NowMs()) < deadline && writer_.Waiting() == 0) {
        std::this_thread::sleep_for(kFinishRetry);
        isFlushed = accounting_.Finish();
    }
    rules_.Finish();
    setAside_.Finish();
    if (isLoaded_ && writer_.Waiting() == 0 && SavePlaces())
        rules_.Deliver(now_ / kSecondMs, [this] { return SavePlaces(); });
    TellDone();
    Logger().LogAddServStop(kReceiverName);
    state_.ended = std::time(nullptr);
    now_ = NowMs();
    WriteState();
}

} // namespace kelo::tool
