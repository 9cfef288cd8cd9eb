// SyslogDBEpsGet over a day of samples of 50 devices, against a plain SQLite loop that builds the same map.

#include <string>

#include "kelosyslog/dbutil.h"
#include "support/account_database.h"
#include "support/folder.h"
#include "support/measure.h"

using namespace kelo::bench;

namespace {

constexpr int kFirst = 1577836800;
constexpr int kSamples = 86400;
constexpr int kRounds = 9;

using Samples = std::map<int, SYSLOG_LOG_EPS>;

Samples LoopOver(const std::string &path) {
    const Database db = OpenDatabase(path);
    const Query query =
        Prepare(db.get(), "SELECT stamp, device, eps FROM eps WHERE stamp >= ? AND stamp <= ?");
    sqlite3_bind_int(query.get(), 1, kFirst);
    sqlite3_bind_int(query.get(), 2, kFirst + kSamples - 1);
    Samples samples;
    while (sqlite3_step(query.get()) == SQLITE_ROW) {
        const int stamp = sqlite3_column_int(query.get(), 0);
        const int eps = sqlite3_column_int(query.get(), 2);
        SYSLOG_LOG_EPS &sample = samples[stamp];
        sample.stamp = stamp;
        sample.eps += eps;
        sample.devices.emplace(reinterpret_cast<const char *>(sqlite3_column_text(query.get(), 1)), eps);
    }
    return samples;
}

size_t RowCount(const Samples &samples) {
    size_t rows = 0;
    for (const auto &[stamp, sample] : samples)
        rows += sample.devices.size();
    return rows;
}

} // namespace

int main() {
    const Folder folder("bench-epsget");
    const std::string path = CreateAccountDatabase(folder.Path());
    InsertSamples(OpenDatabase(path).get(), kFirst, kSamples);

    Samples got;
    Samples looped;
    const auto times =
        MedianTimes({{"get",
                      [&] {
                          got.clear();
                          return Time([&] { got = SyslogDBEpsGet(path, kFirst, kFirst + kSamples - 1); });
                      }},
                     {"loop",
                      [&] {
                          looped.clear();
                          return Time([&] { looped = LoopOver(path); });
                      }}},
                    kRounds);
    if (got.size() != kSamples || RowCount(got) != RowCount(looped))
        Fail("SyslogDBEpsGet and the loop read different samples");
    PrintHeading("Reading a day of samples of 50 devices", "ms");
    return PrintRatio("SyslogDBEpsGet", times[0], "sqlite3_step loop", times[1], 1.25) ? 0 : 1;
}
