// Stores the records of a growing log text, and where it was read to: whenever the program is killed, nothing
// is lost and nothing is stored twice.

#include <keloplatform/kelodb.h>
#include <kelosyslog/dbwriter.h>
#include <kelosyslog/logparser.h>

#include <fstream>
#include <iostream>

#include "modern.h"

constexpr char kCreate[] = "CREATE TABLE IF NOT EXISTS position (bytes INTEGER)";

// Runs in the transaction of the records.
int SavePosition(DBConnect_tag *db, void *context) {
    const std::string insert = "INSERT INTO position VALUES (" + *static_cast<std::string *>(context) + ")";
    for (const char *sql : {kCreate, "DELETE FROM position", insert.c_str()})
        if (KELODBExecute(db, sql, nullptr) < 0)
            return -1; // nothing is stored
    return 0;
}

uint64_t LoadPosition(SyslogDBWriter &writer) {
    Check(writer.Open()); // creates a missing database
    DBResult_tag *result = nullptr;
    unsigned int row = 0;
    KELODBExecute(writer.ConnectionGet(), kCreate, nullptr);
    KELODBExecute(writer.ConnectionGet(), "SELECT bytes FROM position", &result);
    const bool isThere = KELODBFetchRow(result, &row) == 0;
    const uint64_t bytes = isThere ? std::stoull(KELODBFetchField(result, row, "bytes")) : 0;
    KELODBFreeResult(result);
    return bytes;
}

void StoreNewLines(const std::string &path, SyslogDBWriter &writer) {
    const uint64_t begin = LoadPosition(writer);
    std::ifstream file(path, std::ios::binary);
    file.seekg(static_cast<std::streamoff>(begin));
    LogParser parser;
    LogStream stream(parser);
    char buffer[4096];
    while (file.read(buffer, sizeof buffer), file.gcount() > 0) {
        stream.Add({buffer, static_cast<size_t>(file.gcount())});
        // A line that is not complete yet is not among the bytes that were taken.
        std::string position = std::to_string(begin + stream.TakenBytes());
        Check(writer.Store(parser.LogListTake(), SavePosition, &position));
    }
    std::cout << "read from byte " << begin << " to " << begin + stream.TakenBytes() << "\n";
}

int main(int argc, char **argv) {
    if (argc != 2)
        return 2;
    const std::string root = argv[1],
                      head = "kern err 2020/01/02 10:11:12 1577931072 0 +00:00 nas ::1 sda 1 ";
    std::ofstream text(root + "/messages", std::ios::binary);
    SyslogDBWriter writer(root + "/logs.db");
    text << head << "disk 1 is full\n" << head << "disk 2" << std::flush;
    StoreNewLines(root + "/messages", writer);
    text << " is full\n" << std::flush;
    StoreNewLines(root + "/messages", writer);

    _SYSLOG_LOG_DATA_tag log;
    log.prio = static_cast<_SYSLOG_DB_PRIORITY_tag>(8);
    if (writer.Store(&log, 1) != 0)
        std::cout << "not stored: " << SyslogFailureGet()->text << "\n";
    SyslogDBReader reader(root + "/logs.db");
    ForEachLog(reader, {}, {0, 0}, {1, SYSLOG_ATTRI_ID}, [](const _SYSLOG_LOG_DATA_tag &stored) {
        std::cout << stored.id << ": " << stored.msg << "\n";
    });
}
