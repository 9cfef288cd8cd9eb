// A nightly job: moves the records before a day into an archive, and reports how many it has of each
// severity. Whenever it is killed or fails, each record is in the log or in the archive, and the next run
// finishes the work. What has come late goes into the archive with the next run.
//
// usage: nightly_job ROOT DATABASE ARCHIVE DAY      (DAY as in 2020/01/31; absolute paths)

#include <kelosyslog/dbutil.h>
#include <kelosyslog/logger.h>
#include <kelosyslog/root.h>

#include <filesystem>
#include <iostream>

#include "forward.h"

namespace {

namespace fs = std::filesystem;

// Returns the id of the last record that the archive has.
std::string Archive(SyslogDBReader &reader, const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                    const std::string &archive, const std::string &schema) {
    Database db(archive, schema); // with the row that describes it
    SyslogDBWriter writer(archive);
    std::string last = Forward(reader, conditions, writer);
    Check(db->DBInfoStartSet(static_cast<unsigned long long>(db->DBLogStartTimeGet())));
    Check(db->DBInfoEndSet(static_cast<unsigned long long>(db->DBLogEndTimeGet())));
    return last;
}

void Report(const std::string &archive) {
    SyslogDBReader reader(archive);
    std::cout << "the archive has " << Check(reader.SelectCount({}, nullptr, nullptr)) << "\n";
    for (const char *severity : g_MappingSyslogPrior) {
        const int count =
            Check(reader.SelectCount({{SYSLOG_ATTRI_PRIO, SYSLOG_OP_EQ, severity, {}}}, nullptr, nullptr));
        if (count > 0)
            std::cout << "  " << severity << " " << count << "\n";
    }
}

void Run(const std::string &root, const std::string &path, const std::string &archive,
         const std::string &day) {
    std::list<_SYSLOG_SQL_COND_tag> conditions = {{SYSLOG_ATTRI_LDATE, SYSLOG_OP_LT, day, {}}};
    SyslogDBReader reader(path);
    const int count = Check(reader.SelectCount(conditions, nullptr, nullptr));
    std::cout << "to archive: " << count << "\n";
    if (count > 0) {
        Logger().LogAddArchStart(fs::path(archive).filename());
        const std::string last =
            Archive(reader, conditions, archive, root + "/usr/kelo/syslog/schema/archive.sql");
        conditions.push_back({SYSLOG_ATTRI_ID, SYSLOG_OP_LE, last, {}}); // only what the archive has
        Check(SyslogDBDelete(path, conditions));
        Logger().LogAddArchFinish(fs::path(archive).filename());
    }
    Report(archive);
}

} // namespace

int main(int argc, char **argv) {
    if (argc != 5 || SyslogRootSet(argv[1]) != 0)
        return 2;
    try {
        Run(argv[1], argv[2], argv[3], argv[4]);
        return 0;
    } catch (const Failure &failure) {
        std::cerr << "nightly_job: " << failure.what() << "\n";
        Logger().LogAddArchFailed(fs::path(argv[3]).filename());
        return StatusOf(failure);
    } catch (const std::runtime_error &error) {
        std::cerr << "nightly_job: " << error.what() << "\n";
        return 1;
    }
}
