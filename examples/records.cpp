// The record, the words for its parts, and a row of a database converted to a record.

#include <keloplatform/kelodb.h>
#include <kelosyslog/records.h>
#include <syslog.h>

#include <iostream>

#include "modern.h"

int PrintLogs(DBResult_tag *result, void *) {
    _SYSLOG_LOG_DATA_tag log; // one for all rows: a conversion sets what its table has
    for (unsigned int row = 0; KELODBFetchRow(result, &row) == 0;)
        if (DBRecToLogInfo("logs", result, row, &log, true) == 0) // true: without the user's name
            std::cout << log.id << " " << g_MappingSyslogPrior[log.prio] << " " << log.host << " [" << log.msg
                      << "]\n";
    return 0;
}

int main(int argc, char **argv) {
    if (argc != 2)
        return 2;
    openlog("example", LOG_PERROR, LOG_USER);

    std::cout << "err is severity " << PriorStrToType("err") << ", 'loud' is " << PriorStrToType("loud")
              << ", 4 is " << PriorTypeToStr(SYSLOG_PRIO_WARNING) << "\n";
    std::cout << "column 'ip' is attribute " << LogAttriType("ip") << ", attribute " << SYSLOG_ATTRI_XFERIP
              << " is column '" << LogAttriStrGet(SYSLOG_ATTRI_XFERIP) << "' too, 'colour' is "
              << LogAttriType("colour") << "\n";
    std::cout << "operator 7 is " << g_MappingSyslogOP[SYSLOG_OP_NOT_LIKE] << "\n";
    std::cout << "[" << TrimUserName("alice:logged in") << "] [" << TrimUserName("no colon") << "]\n";
    std::cout << "SMB transfers: " << XferlogDBPathGet("smbxfer") << "\n";

    const std::string root = argv[1];
    Database db(root + "/logs.db", root + "/usr/kelo/syslog/schema/logs.sql");
    db->DBExecute("INSERT INTO logs (host, prio, msg) VALUES ('nas', 'notice', 'alice: logged in')");
    db->DBExecute("INSERT INTO logs (host, msg) VALUES (NULL, 'no host and no severity')");
    db->DBExecute("SELECT * FROM logs", PrintLogs, nullptr);
}
