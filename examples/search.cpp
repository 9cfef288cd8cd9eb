// Fills in a search form, pages through the matching records, counts them and deletes them.

#include <kelosyslog/dbhandler.h>
#include <kelosyslog/dbutil.h>
#include <syslog.h>

#include <iostream>

int PrintLog(_SYSLOG_LOG_DATA_tag &log, void *context) {
    std::cout << "  " << log.id << " " << log.ldate << " " << log.host << " " << PriorTypeToStr(log.prio)
              << ": " << log.msg << "\n";
    int &wanted = *static_cast<int *>(context);
    return --wanted == 0 ? 1 : 0; // non-zero ends the scan
}

int main(int argc, char **argv) {
    if (argc != 2)
        return 2;
    openlog("example", LOG_PERROR, LOG_USER);
    const std::string root = argv[1], path = root + "/logs.db";
    DBHandler db(path, root + "/usr/kelo/syslog/schema/logs.sql");
    if (db.DBCon() != 0)
        return 1;
    db.DBExecute("INSERT INTO logs (host, prio, fac, prog, ldate, msg) VALUES"
                 " ('nas',  'err',  'kern', 'smartd', '2019/12/31', 'disk 1 is full'),"
                 " ('nas',  'err',  'kern', 'smartd', '2020/01/01', 'disk 2 is full'),"
                 " ('web1', 'err',  'kern', 'smartd', '2020/01/02', 'disk 1 is full'),"
                 " ('nas',  'crit', 'kern', 'smartd', '2020/01/02', 'disk 2 is full'),"
                 " ('nas',  'err',  'user', 'smartd', '2020/01/02', 'disk 2 is full'),"
                 " ('nas',  'err',  'kern', 'rsyncd', '2020/01/02', 'disk 2 is full'),"
                 " ('nas',  'err',  'kern', 'smartd', '2020/01/03', 'disk 2 failed'), "
                 " ('nas',  'err',  'kern', 'smartd', '2020/01/04', 'disk 3 is full'),"
                 " ('web2', 'err',  'kern', 'smartd', '2020/01/05', 'full disk'),     "
                 " ('web2', 'err',  'kern', 'smartd', '2020/01/06', 'disk is full')   ");
    db.DBExecute("UPDATE logs SET llevel = prio"); // both hold the word; the form compares llevel
    db.DBDiscon(); // searching needs no handler: every call opens and closes its own connection

    std::list<_SYSLOG_SQL_COND_tag> form; // host, severity, facility, program, keyword, first and last day
    LogSearchCondListGen("nas,web2", "err", "kern", "smartd", "disk full", "2020/01/01", "2020/01/05", form);
    LogSearchCondListGen("any", "", "any", "", "", "", "0", form); // adds nothing: "any", "" and "0" mean all
    std::cout << SyslogDBSelectCount(path, form, nullptr, nullptr) << " logs match\n";

    _SYSLOG_SQL_LIMIT_tag page{2, 0}; // two rows, after skipping none
    _SYSLOG_SQL_ORDER_tag newestFirst{0, SYSLOG_ATTRI_ID};
    int wanted = 10;
    std::cout << "first page:\n";
    SyslogDBSelect(path, form, &page, &newestFirst, PrintLog, &wanted, false);
    page.offset = 2;
    std::cout << "second page:\n";
    SyslogDBSelect(path, form, &page, &newestFirst, PrintLog, &wanted, false);
    wanted = 1;
    std::cout << "the oldest of all logs:\n";
    SyslogDBSelect(path, {}, nullptr, nullptr, PrintLog, &wanted, false);

    std::cout << "deleted: " << SyslogDBDelete(path, form) << ", match now: ";
    std::cout << SyslogDBSelectCount(path, form, nullptr, nullptr) << "\n";
    std::cout << "relative path: "
              << SyslogDBSelect("logs.db", form, nullptr, nullptr, PrintLog, &wanted, false) << "\n";
}
