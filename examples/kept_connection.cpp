// Searches on a connection that the program keeps, written with modern.h.

#include <iostream>

#include "modern.h"

void Insert(Database &db, const char *message) {
    Check(db->DBExecute("INSERT INTO logs (host, msg) VALUES ('nas', '" + db->DBCmdEscape(message) + "')"));
}

int main(int argc, char **argv) {
    if (argc != 2)
        return 2;
    const std::string root = argv[1], path = root + "/logs.db";
    try {
        Database db(path, root + "/usr/kelo/syslog/schema/logs.sql");
        Transaction transaction(db);
        for (const char *message : {"disk 1 is full", "disk 2 is full", "it's over"})
            Insert(db, message);
        transaction.Commit();

        SyslogDBReader reader(path); // one for each thread
        const std::list<_SYSLOG_SQL_COND_tag> fromNas = {{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "nas", {}}};
        {
            const SyslogDBSnapshot snapshot(reader); // the number and the rows fit together
            std::cout << Check(reader.SelectCount(fromNas, nullptr, nullptr)) << " logs, the newest two:\n";
            Insert(db, "too late for this search");
            ForEachLog(reader, fromNas, {2, 0}, {0, SYSLOG_ATTRI_ID},
                       [](const _SYSLOG_LOG_DATA_tag &log) { std::cout << "  " << log.msg << "\n"; });
        }
        std::cout << "now: " << reader.SelectCount(fromNas, nullptr, nullptr) << "\n";

        std::string clause;
        LogSearchClauseGet(fromNas, clause);
        std::cout << "condition: " << clause << "\n";
        SyslogDBReader nowhere(root + "/none.db");
        Check(nowhere.SelectCount(fromNas, nullptr, nullptr));
    } catch (const Failure &failure) {
        std::cout << failure.what() << (failure.kind == KELO_FAILURE_MISSING ? " (missing)\n" : "\n");
    }
}
