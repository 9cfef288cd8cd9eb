#include <sqlite3.h>
#include <sys/stat.h>
#include <syslog.h>

#include <algorithm>
#include <cerrno>
#include <memory>
#include <new>
#include <utility>
#include <vector>

#include "accounting/device_table.h"
#include "common/failure.h"
#include "common/root.h"
#include "kelosyslog/accounting.h"
#include "kelosyslog/dbhandler.h"
#include "kelosyslog/debuger.h"
#include "kelosyslog/utils.h"

namespace {

constexpr off_t kTrimAboveBytes = 5242880;

struct SqliteFree {
    void operator()(char *text) const { sqlite3_free(text); }
};

template <typename... Arguments>
std::string Format(const char *format, Arguments... arguments) {
    const std::unique_ptr<char, SqliteFree> text(sqlite3_mprintf(format, arguments...));
    if (text == nullptr)
        throw std::bad_alloc();
    return text.get();
}

void ReportFailedStatement(const std::string &sql) {
    Debuger::MSG(0, "Fail to execute SQL command: " + sql);
}

// The database of one flush. In every case the transaction is ended and the connection closed.
//
// Without a transaction, because its BEGIN failed, every row is stored by itself.
class FlushDatabase {
public:
    explicit FlushDatabase(const std::string &path)
        : path_(path), db_(path, kelo::RootedPath("/usr/kelo/syslog/schema/accinfo.sql")) {}
    ~FlushDatabase() {
        if (!hasEnded_)
            EndAfterFailure();
        db_.DBDiscon();
    }
    FlushDatabase(const FlushDatabase &) = delete;
    FlushDatabase &operator=(const FlushDatabase &) = delete;

    bool Connect() {
        if (db_.DBCon() < 0) {
            Debuger::MSG(0, "Fail to connect db");
            return false;
        }
        isOpen_ = db_.DBTranStart() == 0;
        return true;
    }

    // Ends the transaction, at the first call. Returns false when rows of it may not be in the file.
    bool End() {
        if (std::exchange(hasEnded_, true))
            return true;
        return db_.DBTranEnd() == 0 || !isOpen_;
    }

    // A failure leaves the rows before it in the transaction, to be committed.
    bool WriteEps(const std::string &stamp, const std::string &device, int32_t count) {
        const std::string sql = Format("INSERT INTO eps VALUES(NULL, '%q', '%q', '%q');", stamp.c_str(),
                                       device.c_str(), std::to_string(count).c_str());
        if (db_.DBExecute(sql) >= 0)
            return true;
        ReportFailedStatement(sql);
        return false;
    }

    // A failure rolls the whole flush back.
    bool WriteHistogram(const std::string &device, uint64_t count) {
        const std::string sql = Format("INSERT OR REPLACE INTO histogram VALUES(NULL, '%q', %q);",
                                       device.c_str(), ullNumberToString(count).c_str());
        if (db_.DBExecute(sql) >= 0)
            return true;
        const kelo::FailureKeeper keeper;
        db_.DBTranRollback();
        ReportFailedStatement(sql);
        return false;
    }

    // A failure rolls the whole flush back. Without a transaction nothing runs: it would be no part of one.
    bool Run(const std::vector<std::string> &statements) {
        const auto fails = [this](const std::string &sql) { return db_.DBExecute(sql) < 0; };
        const auto failed =
            isOpen_ ? std::find_if(statements.begin(), statements.end(), fails) : statements.begin();
        if (failed == statements.end())
            return true;
        db_.DBTranRollback();
        ReportFailedStatement(*failed);
        return false;
    }

    // Deletes old samples from a file that has grown large. Only a file whose size is unknown is a
    // failure.
    bool Trim() {
        struct stat status {};
        if (stat(path_.c_str(), &status) != 0) {
            kelo::FailWithErrno(path_, "stat", errno);
            Debuger::MSG(0, "Fail to state file status: " + path_);
            return false;
        }
        if (!S_ISREG(status.st_mode)) {
            kelo::Fail(KELO_FAILURE_ARGUMENT, path_, "stat", "it is no regular file");
            Debuger::MSG(0, "Working database is not regular file");
            return false;
        }
        const std::string sql = "DELETE FROM eps WHERE stamp < strftime('%s', 'now') - 24*60*60;";
        if (status.st_size > kTrimAboveBytes && db_.DBExecute(sql) < 0)
            ReportFailedStatement(sql);
        return true;
    }

private:
    void EndAfterFailure() {
        const kelo::FailureKeeper keeper;
        try {
            End();
        } catch (const std::bad_alloc &) {
            syslog(LOG_ERR, "Fail to end transaction");
        }
    }

    const std::string &path_;
    DBHandler db_;
    bool isOpen_ = false;
    bool hasEnded_ = false;
};

} // namespace

int AccountingManager::AccoutingFlush2DB() {
    if (samples_.empty())
        return 0;
    FlushDatabase db(dbPath_);
    if (!db.Connect())
        return -1;
    for (Sample &sample : samples_) {
        std::sort(sample.devices.begin(), sample.devices.end(),
                  [](const auto &one, const auto &other) { return one.first->name < other.first->name; });
        const std::string stamp = std::to_string(sample.stamp);
        for (const auto &[device, count] : sample.devices) {
            if (!db.WriteEps(stamp, device->name, count))
                return -1;
        }
    }
    for (size_t i = 0; i < devices_->Size(); ++i) {
        const kelo::Device &device = (*devices_)[i];
        if (!db.WriteHistogram(device.name, devices_->CountsOf(device).total))
            return -1;
    }
    if (flushStatements_ && !db.Run(flushStatements_()))
        return -1;
    if (!db.Trim() || !db.End())
        return -1;
    samples_.clear();
    return 0;
}
