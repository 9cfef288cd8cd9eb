#pragma once

// Counts of received records: in total, per second and per sending device.
//
//     AccountingManager accounting;      // loads the stored histogram
//     for (std::string host; Receive(host);)
//         accounting.LogInc(host);
//     if (accounting.isNeed2Flush())     // call it every 6 seconds or less often
//         accounting.AccoutingFlush2DB();
//
// At the first record of a new second the manager closes a sample: records per device since the sample
// before. A sample that reaches the threshold of a rule causes a notification and an event. Samples are kept
// until a flush has written them.
//
// Threads: one object for each accounting database, used by one thread at a time.
//
// Only closed samples are flushed, and the histogram only together with one: what was counted after that is
// lost with the object. To end without loss, repeat these two lines until CurrentEpsGet() is 0 and the flush
// returns 0; the first closes the open sample as soon as the second has changed:
//
//     accounting.CurEpsUpdate();
//     accounting.AccoutingFlush2DB();
//
// When memory runs out, operations throw std::bad_alloc; the counts stay as they were.

#include <cstdint>
#include <functional>
#include <list>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "kelosyslog/dbutil.h"
#include "kelosyslog/export.h"
#include "kelosyslog/notification.h"

namespace kelo {
struct Device;
class DeviceTable;
} // namespace kelo

// One entry of the histogram.
struct KELOLOG_LOG_DEVICE_STATISTIC {
    std::string device;
    uint64_t count = 0; // cumulative, across flushes and restarts
};

class KELOSYSLOG_API AccountingManager {
public:
    // Loads the stored histogram and the notification rules. A database that is missing or cannot be read
    // is taken as empty.
    AccountingManager();
    // The same on the accounting database at `dbPath`, an absolute path.
    explicit AccountingManager(std::string dbPath);
    // Flushes the closed samples once more; a failure is only reported. The open sample is not closed.
    ~AccountingManager();
    AccountingManager(const AccountingManager &) = delete;
    AccountingManager &operator=(const AccountingManager &) = delete;

    // Sets the path of the accounting database, "/var/log/kelolog/.KELOACCOUNTDB". Reads no file; always 0.
    int ConfigLoad();

    // Counts one record from `device`, a text of any bytes (the database keeps it up to its first NUL), after
    // closing the sample if the second has changed. Always 0. Its cost does not depend on the number of
    // devices.
    int LogInc(std::string device);

    // Closes the current sample if it is not empty and the clock has left the second in which the last one
    // was closed. Its stamp is the present second. Always 0.
    int CurEpsUpdate();

    // Whether more than 5 seconds have passed since the previous call; true at the first call.
    bool isNeed2Flush();

    // Writes the closed samples and the histogram to the database, which is created when missing, in one
    // transaction. Without samples it does nothing. When the file is larger than 5 MiB, samples older than a
    // day are deleted.
    //
    // Returns 0 when all of it is in the file, or -1 after a report; the samples then stay for the next
    // flush. A failed insert of a sample leaves those before it in the database, and the next flush writes
    // them again. If the transaction could not be started the rows are stored one by one.
    int AccoutingFlush2DB();

    // Discards the oldest closed samples until at most `samples` are left with at most `counts` counts of
    // devices, which take about 16 bytes each. For callers that must limit what waits while the database
    // cannot be written; the histogram does not change. Returns the number of discarded samples.
    size_t SamplesDrop(size_t samples, size_t counts);

    // From now on the count of each sample that is closed goes to `handler`, and the manager neither checks
    // its rules nor sends or adds anything. For callers that limit the notifications, or that load rules
    // anew.
    void EpsHandlerSet(std::function<void(uint64_t eps)> handler);

    // From now on each flush also runs the statements that `statements` returns then, in its transaction and
    // after its rows. For callers that keep with the counts how far they have counted. One that fails makes
    // the flush fail and rolls it back; so does a transaction that could not be started.
    void FlushStatementsSet(std::function<std::vector<std::string>()> statements);

    // Writes the figures to the debug channel at level 2.
    void AccountingDump();

    // Records counted since construction.
    int64_t TotalCountGet() const;
    // Records counted since the last sample was closed.
    int64_t CurrentEpsGet() const;
    // A copy of the histogram: stored devices by name, then devices in the order of their first record.
    std::list<KELOLOG_LOG_DEVICE_STATISTIC> HistogramGet() const;

private:
    struct Sample {
        int64_t stamp;
        std::vector<std::pair<const kelo::Device *, int32_t>> devices; // with their counts, in any order
    };

    KELOSYSLOG_LOCAL void NotifyEps(uint64_t eps);

    std::string dbPath_;
    int64_t totalCount_ = 0;
    int64_t currentSecond_ = 0;
    int64_t currentCount_ = 0;
    int32_t lastFlushCheck_ = 0;
    std::unique_ptr<kelo::DeviceTable> devices_; // in the histogram's order
    std::vector<kelo::Device *> openSample_;     // the devices with records in the open sample
    std::list<Sample> samples_;
    NotificationManager notifications_;
    std::function<void(uint64_t)> epsHandler_; // empty: the rules are checked
    std::function<std::vector<std::string>()> flushStatements_;
};
