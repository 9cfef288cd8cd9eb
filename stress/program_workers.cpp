// The workers that read with the program, and that look after the databases.

#include <set>

#include "kelosyslog/dbutil.h"
#include "worker.h"

namespace kelo::stress {
namespace {

// No record comes twice in one answer, whatever others do meanwhile.
void RequireDistinct(Worker &worker, const std::string &text, const Quiet &quiet, const std::string &what) {
    if (!quiet.WasSafe())
        return;
    std::set<std::string> seen;
    FindTokens(text, [&](const Token &token) {
        if (!seen.insert(TextOf(token)).second)
            worker.Complain(TextOf(token) + " came twice in one answer of " + what);
    });
}

void SelectAll(Worker &worker) {
    const Quiet quiet(worker.board, worker.site, kLogs);
    std::string messages;
    const auto take = [](_SYSLOG_LOG_DATA_tag &log, void *context) {
        static_cast<std::string *>(context)->append(log.msg, 0, 20);
        return 0;
    };
    {
        Operation operation(worker, kSelect);
        operation.Result(SyslogDBSelect(worker.Path(), {}, nullptr, nullptr, take, &messages, false) == 0);
    }
    RequireDistinct(worker, messages, quiet, "SyslogDBSelect");
}

// Finds damage that no statement has met, and has the database set aside for it.
void CheckDatabase(Worker &worker, Database database) {
    const std::string path = worker.site.PathOf(database);
    int status = 0;
    {
        Operation operation(worker, kCheck);
        status = worker.RunProgram({"db", "check", "--db", path}).status;
        operation.Result(status == 0);
    }
    if (status != 3)
        return;
    Operation operation(worker, kQuarantine);
    operation.Result(worker.RunProgram({"db", "quarantine", "--yes", "--db", path}).status == 0);
}

} // namespace

void Search(Worker &worker) {
    const std::vector<std::vector<std::string>> queries = {
        {"search", "-n", "500", "--db", worker.Path()},
        {"search", "-n", "all", "-g", "tok", "--db", worker.Path()},
        {"count", "-g", "xxx", "--db", worker.Path()},
        {"events", "-n", "200"},
        {"stats", "devices"},
        {"values", "host", "--db", worker.Path()}};
    while (!worker.IsOver()) {
        SelectAll(worker);
        const std::vector<std::string> &query = queries[worker.Pick(queries.size())];
        const Quiet quiet(worker.board, worker.site, query[0] == "events" ? kEvents : kLogs);
        ProgramRun run;
        {
            Operation operation(worker, kQuery);
            run = worker.RunProgram(query);
            operation.Result(run.status == 0);
        }
        if (query[0] == "search" || query[0] == "events")
            RequireDistinct(worker, run.out, quiet, "kelosyslog " + query[0]);
        worker.Pause(300);
    }
}

void Keep(Worker &worker) {
    while (!worker.IsOver()) {
        CheckDatabase(worker, static_cast<Database>(worker.Pick(kDatabases)));
        if (worker.OneIn(5)) {
            Operation operation(worker, kEmptyWal);
            operation.Result(worker.RunProgram({"db", "wal", "--db", worker.Path()}).status == 0);
        }
        worker.Pause(500);
    }
}

void Archive(Worker &worker) {
    // One that was killed may have left it odd.
    if (worker.board.archiving % 2 != 0)
        ++worker.board.archiving;
    while (!worker.IsOver()) {
        worker.Pause(1500);
        ++worker.board.archiving;
        // What a damaged write-ahead log takes back would be archived twice.
        if (worker.board.risk[kLogs] % 2 == 0) {
            Operation operation(worker, kArchive);
            operation.Result(worker.RunProgram({"archive", "--remove-archived", "--yes"}, "", 4).status == 0);
        }
        ++worker.board.archiving;
        if (worker.OneIn(4)) {
            Operation operation(worker, kCopy);
            operation.Result(
                worker
                    .RunProgram({"archive", "--to", worker.site.Copies(), "--keep-size", "1M", "--yes"}, "",
                                4)
                    .status == 0);
        }
    }
}

} // namespace kelo::stress
