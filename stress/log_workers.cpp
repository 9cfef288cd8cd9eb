// The workers that store and delete records.

#include <fcntl.h>
#include <sys/prctl.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <fstream>
#include <optional>
#include <set>

#include "base/sqlite.h"
#include "kelosyslog/dbutil.h"
#include "receive/log_writer.h"
#include "store/logs_schema.h"
#include "worker.h"

namespace kelo::stress {
namespace {

// Records that were stored together, under a host of their own.
class Batch {
public:
    Batch(Worker &worker, size_t size)
        : quiet_(worker.board, worker.site, kLogs), worker_(worker), tokens_(worker.Try(size)),
          host_("batch-" + std::to_string(tokens_.front().worker) + "-" +
                std::to_string(tokens_.front().number)) {}

    const std::vector<Token> &Tokens() const { return tokens_; }
    const std::string &Host() const { return host_; }

    // They are stored: into the file that has the name, unless `isElsewhere`. Some are then looked for, and
    // deleted.
    void Stored(bool isElsewhere) {
        worker_.Note(quiet_.WasSafe() ? kAcknowledged : kAtRisk, tokens_);
        if (!isElsewhere && worker_.OneIn(4))
            Find();
        if (worker_.OneIn(10))
            Delete();
    }

private:
    std::list<_SYSLOG_SQL_COND_tag> Conditions() const {
        return {{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, host_, {}}};
    }

    // All of them are there, as one transaction stored them.
    void Find() {
        int count = -1;
        {
            Operation operation(worker_, kCount);
            count = SyslogDBSelectCount(worker_.Path(), Conditions(), nullptr, nullptr);
            operation.Result(count >= 0);
        }
        std::multiset<std::string> texts;
        const auto take = [](_SYSLOG_LOG_DATA_tag &log, void *context) {
            static_cast<std::multiset<std::string> *>(context)->insert(log.msg.substr(0, log.msg.find(' ')));
            return 0;
        };
        bool isSelected = false;
        {
            Operation operation(worker_, kSelect);
            isSelected = operation.Result(
                SyslogDBSelect(worker_.Path(), Conditions(), nullptr, nullptr, take, &texts, false) == 0);
        }
        if (!quiet_.WasSame())
            return;
        const auto expected = static_cast<int>(tokens_.size());
        if (count >= 0 && count != expected)
            worker_.Complain(host_ + " has " + std::to_string(expected) + " records, the count gave " +
                             std::to_string(count));
        if (isSelected && !std::all_of(tokens_.begin(), tokens_.end(),
                                       [&](const Token &token) { return texts.count(TextOf(token)) == 1; }))
            worker_.Complain(host_ + " has " + std::to_string(expected) + " records, " +
                             std::to_string(texts.size()) + " were selected");
    }

    void Delete() {
        const Quiet quiet(worker_.board, worker_.site, kLogs);
        worker_.Note(kDeleting, tokens_);
        bool isDone = false;
        {
            Operation operation(worker_, kDelete);
            isDone = worker_.OneIn(10) ? worker_.RunProgram({"delete", "--host", host_, "--yes"}).status == 0
                                       : SyslogDBDelete(worker_.Path(), Conditions()) == 0;
            operation.Result(isDone);
        }
        if (isDone)
            worker_.Note(quiet.WasSafe() ? kDeleted : kUnsureDeleted, tokens_);
    }

    const Quiet quiet_;
    Worker &worker_;
    const std::vector<Token> tokens_;
    const std::string host_;
};

volatile std::sig_atomic_t mustReopen = 0;

// The library finds the process to reload as it finds the daemon.
void PassForSyslogNg(const Site &site) {
    std::signal(SIGHUP, [](int) { mustReopen = 1; });
    prctl(PR_SET_NAME, "syslog-ng");
    std::ofstream(site.Root() + "/run/syslog-ng.pid") << getpid() << "\n"; // on another disk
}

// A connection as the daemon has it: on a file that is created when missing, and that keeps its name while it
// is opened.
void Open(std::optional<tool::SqliteConnection> &db, const std::string &path) {
    do {
        db.reset();
        db.emplace(path, tool::SqliteOptions{.mode = tool::SqliteMode::kCreate, .busyTimeoutMs = 5000});
        db->Run("PRAGMA user_version");
    } while (db->HasMoved());
    db->Run("PRAGMA journal_mode=WAL; PRAGMA synchronous=NORMAL"); // its session statements
    db->Run(tool::kLogsTables);
}

void Insert(tool::SqliteConnection &db, Worker &worker, const Batch &batch) {
    tool::SqliteTransaction transaction(db);
    tool::SqliteStatement insert(db, "INSERT INTO logs(host,prog,prio,llevel,utcsec,ldate,msg) "
                                     "VALUES(?1,'daemon','info','info',?2,'2020/01/01',?3)");
    for (const Token &token : batch.Tokens()) {
        const std::string text = worker.TextWith(token);
        insert.Bind(1, batch.Host());
        insert.Bind(2, int64_t{1577836800} + token.number);
        insert.Bind(3, text);
        insert.Run();
    }
    transaction.Commit();
}

// A line of log text.
std::string LineOf(Worker &worker, const Token &token, const std::string &host) {
    return "daemon info 2020/01/01 10:11:12 " + std::to_string(1577836800 + token.number) + " 7 +08:00 " +
           host + " 192.168.1.1 prog 1e " + worker.TextWith(token) + "\n";
}

} // namespace

void WriteLikeSyslogNg(Worker &worker) {
    PassForSyslogNg(worker.site);
    std::optional<tool::SqliteConnection> db;
    while (!worker.IsOver()) {
        Batch batch(worker, 1 + worker.Pick(20));
        bool isElsewhere = false;
        try {
            if (mustReopen != 0) {
                mustReopen = 0;
                db.reset();
            }
            Operation operation(worker, kInsert);
            if (!db)
                Open(db, worker.Path());
            Insert(*db, worker, batch);
            operation.Result(true);
            isElsewhere = db->HasMoved();
        } catch (const tool::SqliteError &) {
            db.reset();
            worker.Pause(50);
            continue;
        }
        batch.Stored(isElsewhere);
        worker.Pause(20);
    }
}

void Receive(Worker &worker) {
    tool::DiskSpaceMonitor volume(worker.site.Root(), worker.site.Root() + "/var/log/kelosyslog");
    tool::LogWriter writer(worker.Path(), volume);
    int64_t now = 0; // a clock that goes fast, so that no pause is long
    while (!worker.IsOver()) {
        Batch batch(worker, 1 + worker.Pick(200));
        for (const Token &token : batch.Tokens()) {
            _SYSLOG_LOG_DATA_tag log;
            log.host = batch.Host();
            log.prog = "prog";
            log.utcsec = int64_t{1577836800} + token.number;
            log.msg = worker.TextWith(token);
            writer.Take(log, now);
        }
        bool isStored = false;
        while (!isStored && !worker.IsOver()) {
            now += 5000;
            Operation operation(worker, kStore);
            isStored = operation.Result(writer.Advance(now, true));
            if (!isStored)
                worker.Pause(20);
        }
        if (isStored)
            batch.Stored(false); // the writer looked whether its file still has the name
        if (worker.OneIn(10))
            writer.Reopen();
        worker.Pause(20);
    }
}

void ParseTexts(Worker &worker) {
    while (!worker.IsOver()) {
        Batch batch(worker, 1 + worker.Pick(50));
        std::string text;
        for (const Token &token : batch.Tokens())
            text += LineOf(worker, token, batch.Host());
        bool isStored = false;
        {
            Operation operation(worker, kParse);
            isStored =
                operation.Result(worker.RunProgram({"parse", "--db", worker.Path(), "-"}, text).status == 0);
        }
        if (isStored)
            batch.Stored(false);
        worker.Pause(50);
    }
}

} // namespace kelo::stress
