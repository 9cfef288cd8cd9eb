// Conditions made by hand: comparisons, wildcards, alternatives, and an SQL expression.

#include <kelosyslog/dbutil.h>
#include <syslog.h>

#include <iostream>

#include "modern.h"

using Condition = _SYSLOG_SQL_COND_tag;

int PrintMessage(_SYSLOG_LOG_DATA_tag &log, void *) {
    std::cout << "  [" << log.msg << "]";
    return 0;
}

void Show(const std::string &path, const char *what, const std::list<Condition> &conditions) {
    std::cout << what << ":";
    const int result = SyslogDBSelect(path, conditions, nullptr, nullptr, PrintMessage, nullptr, false);
    std::cout << (result == 0 ? "" : "  failed") << "\n";
}

int main(int argc, char **argv) {
    if (argc != 2)
        return 2;
    openlog("example", LOG_PERROR, LOG_USER);
    const std::string root = argv[1], path = root + "/logs.db";
    Database(path, root + "/usr/kelo/syslog/schema/logs.sql") // connected for this statement
        ->DBExecute("INSERT INTO logs (host, utcsec, msg) VALUES"
                    " ('nas', 10, '100% full'), ('nas', 20, '1000 files'), ('web1', 30, 'it''s up')");

    Show(path, "since 20", {{SYSLOG_ATTRI_UTCSEC, SYSLOG_OP_GE, "20", {}}});
    // '*' and '?' are the wildcards; '%', '_' and quotes in a value are literal.
    Show(path, "100% and more", {{SYSLOG_ATTRI_MSG, SYSLOG_OP_LIKE, "100%*", {}}});
    Show(path, "with a quote", {{SYSLOG_ATTRI_MSG, SYSLOG_OP_LIKE, "*'*", {}}});

    // A list is ANDed; alternatives are ORed: since 20, and of web1 or with "files".
    Condition either{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "web1", {}};
    either.alternatives.push_back({SYSLOG_ATTRI_MSG, SYSLOG_OP_LIKE, "*files*", {}});
    Show(path, "either", {{SYSLOG_ATTRI_UTCSEC, SYSLOG_OP_GE, "20", {}}, either});

    // A raw value goes into the statement unchanged: never take it from a user.
    Show(path, "raw", {{SYSLOG_ATTRI_MSG, SYSLOG_OP_RAW, "length(msg) = 9", {}}});
    Show(path, "bad raw", {{SYSLOG_ATTRI_MSG, SYSLOG_OP_RAW, "length(", {}}});
}
