// Prints the messages of host "nas" in the database at argv[1], the newest first.

#include <kelosyslog/cmdparser.h> // needs jsoncpp
#include <kelosyslog/dbutil.h>

#include <iostream>

int main(int argc, char **argv) {
    if (argc != 2)
        return 2;
    std::list<_SYSLOG_SQL_COND_tag> conditions;
    LogSearchCondListGen("nas", "", "", "", "", "", "", conditions);
    _SYSLOG_SQL_ORDER_tag newestFirst{0, SYSLOG_ATTRI_ID};
    const char *separator = "";
    const auto print = [](_SYSLOG_LOG_DATA_tag &log, void *context) {
        auto &before = *static_cast<const char **>(context);
        std::cout << before << log.msg;
        before = " ";
        return 0;
    };
    return SyslogDBSelect(argv[1], conditions, nullptr, &newestFirst, print, &separator, false) == 0 ? 0 : 1;
}
