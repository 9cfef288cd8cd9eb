// The workers of the event log and of accounting.

#include <ctime>

#include "kelosyslog/accounting.h"
#include "kelosyslog/logger.h"
#include "worker.h"

namespace kelo::stress {
namespace {

time_t counted = 0; // the time in the process that counts; 0 elsewhere. A sample closes when it changes

// An event that was just added is among the newest, and the log is not empty.
void FindEvent(Worker &worker, const Token &token, const Quiet &quiet) {
    constexpr int kNewest = 1000; // more than others can add meanwhile
    bool isFound = false;
    size_t events = 0;
    int count = -1;
    {
        Operation operation(worker, kListEvents);
        for (const auto &event : Logger().LogEnum(worker.Path(), 0, kNewest)) {
            ++events;
            isFound = isFound || event.event.starts_with(TextOf(token));
        }
        count = Logger().LogCount(worker.Path());
        operation.Result(events > 0 && count >= 0);
    }
    if (!quiet.WasSame())
        return;
    if (events > 0 && !isFound)
        worker.Complain(TextOf(token) + " was added and is not among " + std::to_string(events) +
                        " newest events");
    if (count == 0)
        worker.Complain(TextOf(token) + " was added and LogCount gave 0");
}

// The count of a device that was flushed, of which only this process knows.
void FindCount(Worker &worker, const Token &token, uint64_t count, const Quiet &quiet) {
    uint64_t stored = 0;
    {
        Operation operation(worker, kReadHistogram);
        stored = SyslogDBHistGetSingle(worker.Path(), TextOf(token));
        operation.Result(stored != 0); // a failure gives 0
    }
    if (stored != 0 && stored != count && quiet.WasSame())
        worker.Complain(TextOf(token) + " was counted " + std::to_string(count) +
                        " times, the histogram has " + std::to_string(stored));
}

} // namespace

void AddEvents(Worker &worker) {
    const Logger logger;
    while (!worker.IsOver()) {
        const Quiet quiet(worker.board, worker.site, worker.database);
        const std::vector<Token> token = worker.Try(1);
        bool isAdded = false;
        {
            Operation operation(worker, kAddEvent);
            isAdded =
                operation.Result(logger.LogAdd(worker.Path(), 0, "stress", worker.TextWith(token[0])) == 0);
        }
        worker.Note(!isAdded ? kRefused : quiet.WasSafe() ? kAcknowledged : kAtRisk, token);
        if (!isAdded)
            worker.Pause(20);
        else if (worker.OneIn(10))
            FindEvent(worker, token[0], quiet);
    }
}

void CountRecords(Worker &worker) {
    counted = std::time(nullptr);
    AccountingManager accounting;
    accounting.LogInc("first"); // would be a sample of its own
    accounting.CurEpsUpdate();
    std::vector<Token> waiting; // devices of samples that no flush has stored
    while (!worker.IsOver()) {
        const Quiet quiet(worker.board, worker.site, worker.database);
        const std::vector<Token> devices = worker.Try(1 + worker.Pick(3));
        const size_t count = 1 + worker.Pick(5);
        for (const Token &device : devices) {
            for (size_t i = 0; i < count; ++i)
                accounting.LogInc(TextOf(device));
        }
        waiting.insert(waiting.end(), devices.begin(), devices.end());
        ++counted;
        accounting.CurEpsUpdate();
        bool isFlushed = false;
        {
            Operation operation(worker, kFlush);
            isFlushed = operation.Result(accounting.AccoutingFlush2DB() == 0);
        }
        worker.Note(!isFlushed ? kAgain : quiet.WasSafe() ? kAcknowledged : kAtRisk, waiting);
        if (isFlushed) {
            waiting.clear();
            FindCount(worker, devices[0], count, quiet);
        }
        worker.Pause(100); // each flush writes the whole histogram, which grows
    }
}

} // namespace kelo::stress

extern "C" time_t time(time_t *seconds) noexcept {
    timespec now{};
    clock_gettime(CLOCK_REALTIME, &now);
    const time_t shown = kelo::stress::counted != 0 ? kelo::stress::counted : now.tv_sec;
    if (seconds != nullptr)
        *seconds = shown;
    return shown;
}
