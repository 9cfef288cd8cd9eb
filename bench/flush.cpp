// A flush of 3,600 samples of 50 devices, against one transaction of the same rows with prepared statements.

#include <cstdlib>
#include <ctime>
#include <string>

#include "kelosyslog/accounting.h"
#include "kelosyslog/root.h"
#include "support/account_database.h"
#include "support/folder.h"
#include "support/measure.h"

using namespace kelo::bench;

namespace {

constexpr int kSamples = 3600;
constexpr int kDevices = 50;
constexpr int kRounds = 5;

time_t now = 1577836800;

} // namespace

// The clock of the library, which closes a sample when it moves on.
extern "C" time_t time(time_t *seconds) noexcept {
    if (seconds != nullptr)
        *seconds = now;
    return now;
}

namespace {

void CountHour(AccountingManager &accounting) {
    accounting.LogInc(DeviceName(0)); // of the sample that the first second closes
    for (int second = 0; second < kSamples; ++second) {
        ++now;
        for (int device = 0; device < kDevices; ++device)
            accounting.LogInc(DeviceName(device));
    }
    ++now;
    accounting.CurEpsUpdate();
}

std::string AskText(const std::string &path, const char *sql) {
    const Database db = OpenDatabase(path);
    const Query query = Prepare(db.get(), sql);
    sqlite3_step(query.get());
    return reinterpret_cast<const char *>(sqlite3_column_text(query.get(), 0));
}

double Flush(const std::string &root) {
    const std::string path = CreateAccountDatabase(root);
    AccountingManager accounting;
    CountHour(accounting);
    const double time = Time([&] {
        if (accounting.AccoutingFlush2DB() != 0)
            Fail("the flush failed");
    });
    if (AskText(path, "SELECT count(*) FROM eps") != std::to_string(kSamples * kDevices + 1))
        Fail("the flush wrote other rows");
    return time;
}

double InsertBare(const std::string &root) {
    const std::string path = CreateAccountDatabase(root);
    return Time([&] {
        const Database db = OpenDatabase(path);
        InsertSamples(db.get(), 1577836800, kSamples);
        const Query replace = Prepare(db.get(), "INSERT OR REPLACE INTO histogram VALUES(NULL, ?, ?)");
        Run(db.get(), "BEGIN");
        for (int device = 0; device < kDevices; ++device) {
            const std::string name = DeviceName(device);
            sqlite3_bind_text(replace.get(), 1, name.c_str(), -1, SQLITE_STATIC);
            sqlite3_bind_int(replace.get(), 2, kSamples);
            sqlite3_step(replace.get());
            sqlite3_reset(replace.get());
        }
        Run(db.get(), "END");
    });
}

} // namespace

int main() {
    const Folder folder("bench-flush");
    SyslogRootSet(folder.Path());
    const auto times = MedianTimes({{"flush", [&] { return Flush(folder.Path()); }},
                                    {"bare", [&] { return InsertBare(folder.Path()); }}},
                                   kRounds);
    PrintHeading("Flushing 3600 samples of 50 devices", "ms");
    return PrintRatio("AccoutingFlush2DB", times[0], "transaction with prepared statements", times[1], 2) ? 0
                                                                                                          : 1;
}
