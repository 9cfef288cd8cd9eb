#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "base/event_loop.h"
#include "receive/accounting_flusher.h"
#include "receive/disk_space_monitor.h"
#include "receive/index_keeper.h"
#include "receive/log_writer.h"
#include "receive/receiver.h"
#include "receive/receiver_state.h"
#include "receive/rule_checker.h"
#include "receive/set_aside_file.h"
#include "receive/spool_folder.h"
#include "receive/spool_place.h"
#include "store/record_batch.h"

namespace kelo::tool {

// Stores the messages of the message spool, counts them and checks them against the rules, each once.
//
// How far the rows go is part of the transaction that has the rows, and so is what the rules made of them:
// the notifications to send, and the counts that limit them. The counts of the accounting have a place of
// their own. So after a kill each reader goes on where it was.
//
// Everything runs on the caller's thread, in turns: what has come is read, stored in one transaction, counted
// and checked. While the database cannot be written the spool grows.
class SpoolReceiver {
public:
    // `options.spool` is the folder of the message spool, `options.database` is not empty. Loads the rules
    // and the counts. Throws std::system_error when the spool cannot be watched, DatabaseError when a
    // database cannot be read.
    explicit SpoolReceiver(ReceiverOptions options);

    // Receives until SIGTERM or SIGINT. What is not stored then stays in the spool. SIGHUP reopens the files
    // and reloads the rules. Throws std::system_error when the spool cannot be read.
    void Run();

private:
    using Places = std::vector<SpoolPlace>;

    std::vector<EventSource> AddSignals();

    bool LoadAll();
    void Restore(SpoolFile &file);
    Places PlacesOf(SpoolReader reader) const;
    void MarkSaved(SpoolReader reader);

    void Work();
    bool StoreWaiting();
    void Turn();
    bool Fill();
    bool ReadFile(SpoolFile &file);
    void Take(SpoolFile &file, std::string_view bytes);
    void TakeRecord(SpoolFile &file, uint64_t end, _SYSLOG_LOG_DATA_tag &log);
    bool GiveUpPartial(SpoolFile &file, std::string_view bytes);
    void Advance(SpoolReader reader);
    void PutAside(const SpoolFile &file, const char *reason, std::string_view bytes);
    bool IsBatchFull() const { return writer_.IsFull() || again_.IsFull(); }
    void Save(SqliteConnection &database);
    void CheckRules();
    void Count(std::span<const _SYSLOG_LOG_DATA_tag> logs);
    bool SavePlaces();
    void TickRules();
    void TellDone();

    void Reload();
    void TickSecond();
    void TickState();
    void WriteState();
    void Finish();

    // A record of the batch.
    struct Source {
        SpoolFile *file;
        uint64_t end;
    };

    ReceiverOptions options_;
    RuleChecker rules_;
    AccountingFlusher accounting_;
    EventLoop loop_;
    std::vector<EventSource> signals_ = AddSignals();
    EventSource turnTimer_ = loop_.AddTimer([] {});
    EventSource secondTimer_ = loop_.AddTimer([this] { TickSecond(); });
    EventSource stateTimer_ = loop_.AddTimer([this] { TickState(); });
    DiskSpaceMonitor volume_;
    SetAsideFile setAside_;
    LogWriter writer_;
    IndexKeeper index_{options_.indexer};
    RecordBatch again_; // records that are stored already, for the counts
    std::vector<Source> sources_;
    SpoolFolder folder_;
    std::string buffer_;
    std::map<SpoolReader, Places> loaded_; // at the start
    std::string done_;                     // as it was told last
    ReceiverState state_;
    uint64_t receivedBefore_ = 0;
    uint64_t unreadBefore_ = 0;
    int64_t stateTime_ = 0;
    int64_t lastUtc_ = 0; // of the record that was read last
    bool isLoaded_ = false;
    bool isScanned_ = false;
    bool hasNews_ = true;
    bool haveNamesChanged_ = true;
    bool isSaveDue_ = false;
    bool isForeignTold_ = false;
    bool isStateFailing_ = false;
    bool areOthersTold_ = false;
    bool mustEnd_ = false;
    // Of the steady clock, in milliseconds.
    int64_t now_ = 0;
    int64_t nextTurn_ = 0;
    int64_t nextRepair_ = 0;
};

} // namespace kelo::tool
