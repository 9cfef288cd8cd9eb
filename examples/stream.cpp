// A stream that arrives in pieces of any size, with a limit for the length of a line.

#include <kelosyslog/debuger.h>
#include <kelosyslog/logparser.h>
#include <syslog.h>

#include <iostream>

int main() {
    openlog("example", LOG_PERROR, LOG_USER);
    const std::string head = "local0 info 2020/01/02 10:11:12 1577931072 0 +00:00 nas ::1 cron 86 ";
    const std::string text = head + "first\n" + head + std::string(200, 'x') + "\n" + head + "last";

    LogParser parser;
    LogStream stream(parser, 100); // lines of up to 100 bytes; the parser must outlive the stream
    for (size_t at = 0; at < text.size(); at += 7) {
        stream.Add(std::string_view(text).substr(at, 7));
        for (const _SYSLOG_LOG_DATA_tag &log : parser.LogListTake()) // as soon as a line is complete
            std::cout << "at byte " << at << ": " << log.msg << "\n";
    }
    stream.Finish(); // the last line had no line feed
    std::cout << "at the end: " << parser.LogGetCount() << ", dropped: " << stream.OverlongCount() << "\n";

    Debuger::ThresholdSet(2);
    parser.LogDump();
    parser.LogReset();
}
