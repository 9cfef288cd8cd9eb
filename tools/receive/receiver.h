#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "base/event_loop.h"
#include "receive/accounting_flusher.h"
#include "receive/disk_space_monitor.h"
#include "receive/index_keeper.h"
#include "receive/log_writer.h"
#include "receive/receiver_state.h"
#include "receive/rule_checker.h"
#include "receive/set_aside_file.h"
#include "store/block_reader.h"
#include "store/log_import.h"

namespace kelo::tool {

struct ReceiverOptions {
    std::string root;          // of the system's files, absolute or empty
    std::string spool;         // folder of the message spool, for SpoolReceiver
    std::string database;      // to store into; empty: records are only counted and checked
    std::string indexer;       // program that builds the index for keywords (IndexKeeper); empty: none
    std::string setAside;      // file for lines that are not valid records; empty: the default below the root
    uint64_t notifyLimit = 10; // notifications a minute for each rule
    size_t deviceLimit = 10'000; // devices that are counted each by its name
};

// Adds an event when records were counted as those of other devices. Returns whether it was added.
bool TellOtherDevices(const ReceiverOptions &options, uint64_t others);

// Receives log text from a pipe: counts the records, checks them against the rules and stores them.
//
// Everything runs on the caller's thread, in the handlers of an event loop and between two events: long work
// delays the next read. While the database cannot be written nothing is read, so that the sender waits and
// memory stays bounded.
class Receiver : private RecordSink {
public:
    // Loads the rules and the counts, and handles the signals from then on. Throws std::system_error.
    explicit Receiver(ReceiverOptions options);

    // Receives from the file descriptor until its end, or until SIGTERM or SIGINT has come and nothing more
    // follows. The records are then stored and flushed, for up to 20 seconds; otherwise the system log
    // reports what is lost. SIGHUP reopens the files and reloads the rules. Throws std::system_error when the
    // input cannot be read, after doing the same.
    void Run(int input);

private:
    std::vector<EventSource> AddSignals();
    void ReceiveUntilEnd(int input);
    void Read(BlockReader &input);
    void Take(_SYSLOG_LOG_DATA_tag &log) override;
    bool Advance();
    bool HasEnded(const BlockReader &input) const;
    void Reload();
    bool IsIdle() const;
    void TickSecond();
    void Repair();
    void TickState();
    void WriteState();
    void Finish();
    uint64_t Received() const;

    ReceiverOptions options_;
    // First, as they load files, which may take seconds: a signal ends the program until then.
    RuleChecker rules_;
    AccountingFlusher accounting_;
    EventLoop loop_;
    std::vector<EventSource> signals_ = AddSignals();
    // They call TickSecond, TickState and Advance.
    EventSource secondTimer_ = loop_.AddTimer([this] { TickSecond(); });
    EventSource stateTimer_ = loop_.AddTimer([this] { TickState(); });
    EventSource writerTimer_ = loop_.AddTimer([] {});
    DiskSpaceMonitor volume_;
    SetAsideFile setAside_;
    std::optional<LogWriter> writer_;
    IndexKeeper index_{options_.indexer};
    LineReader lines_;
    LogImport import_;
    ReceiverState state_;
    uint64_t receivedBefore_ = 0; // at the last update of the state
    int64_t stateTime_ = 0;
    bool isStateFailing_ = false;
    bool areOthersTold_ = false;
    bool isReading_ = false;
    bool isTicking_ = true;
    bool hasInputEnded_ = false;
    // Of the steady clock, in milliseconds.
    int64_t now_ = 0;
    int64_t nextRepair_ = 0;
    int64_t silentSince_ = 0;
    std::optional<int64_t> stopTime_; // when the signal came
};

} // namespace kelo::tool
