// Converts log text to records: lines that are complete, incomplete and invalid.

#include <kelosyslog/debuger.h>
#include <kelosyslog/logparser.h>
#include <syslog.h>

#include <iostream>

int main() {
    openlog("example", LOG_PERROR, LOG_USER);
    std::string text = // fac prio date time utcsec extnum tzoffset host ip prog tag message
        "local0 info 2020/01/02 10:11:12 1577931072 200 +08:00 nas 127.0.0.1 cron 86 two  blanks kept\n"
        "kern loud 2020/01/02 10:11:13 1577931073 1 +08:00 web1 ::1 kernel 05 unknown severity\n"
        "kern err 2020/01/02 10:11:14 1577931074 1 +08:00 web1 ::1 kernel 05 \n"
        "this line has too few fields\n";

    LogParser parser;
    parser.LogAdd(text); // always 0: an invalid line is reported and skipped
    std::cout << parser.LogGetCount() << " records\n";
    for (_SYSLOG_LOG_DATA_tag &log : parser.LogListTake()) // moved out: the parser's list is empty now
        if (parser.isValidLog(log))
            std::cout << "  " << log.utcsec << " " << log.host << " " << PriorTypeToStr(log.prio) << " ["
                      << log.msg << "]\n";

    parser.PartialLogDump();  // goes to the debug channel, which is silent
    Debuger::ThresholdSet(2); // until the program asks for it
    parser.PartialLogDump();
    parser.PartialLogSet("local0 info 2020/01/02 10:11:15 1577931075 0 "); // prefixed to the next text
    std::string rest = "+08:00 nas ::1 cron 86 put together";
    parser.LogAdd(rest);
    parser.LogDump();

    // One line at a time, without the parser's list.
    _SYSLOG_LOG_DATA_tag log;
    const int result = parser.ParseSingleEntry("local0 info d t 1 2 z host ip prog tag message", log);
    std::cout << "one entry: " << result << " [" << log.msg << "]\n";
}
