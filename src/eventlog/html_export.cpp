#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <ctime>
#include <memory>

#include "common/failure.h"
#include "kelosyslog/logger.h"

namespace {

struct CloseFile {
    void operator()(FILE *file) const { std::fclose(file); }
};
using File = std::unique_ptr<FILE, CloseFile>;

std::string LocalTime(int64_t utcsec) {
    const auto time = static_cast<time_t>(utcsec);
    tm parts{};
    char text[1024] = {};
    if (localtime_r(&time, &parts) != nullptr)
        std::strftime(text, sizeof text, "%Y-%m-%dT%H:%M:%S", &parts);
    return text;
}

// Users and events are written unchanged, because the programs that read this page expect that.
void WriteEvent(FILE *page, const _SSYSLOG_LOG_LOG_tag &event) {
    char level[1024] = {};
    szLevelGet(event.level, level, sizeof level);
    std::fprintf(page,
                 "<tr>\n"
                 "<td align=\"center\">%s</td>\n"
                 "<td align=\"center\">%s</td>"
                 "<td align=\"center\">%s</td>"
                 "<td align=\"left\">%s</td>"
                 "</tr>\n",
                 level, LocalTime(event.time).c_str(), event.user.c_str(), event.event.c_str());
}

void WritePage(FILE *page, const std::list<_SSYSLOG_LOG_LOG_tag> &events) {
    std::fputs("<html><head>\n"
               "<meta http-equiv=\"Content-Type\" content=\"text/html; charset=utf-8;\">\n"
               "<title>Syslog Server Log</title>\n"
               "</head>\n"
               "<body>\n"
               "<center><h2> Syslog Server Log </h2></center>\n"
               "<table border=1 width=95%>\n"
               "<tr>\n"
               "<th>Type</th><th>Time</th><th>User</th><th>Event</th></tr>\n",
               page);
    for (const _SSYSLOG_LOG_LOG_tag &event : events)
        WriteEvent(page, event);
    std::fputs("</table></body></html>\n", page);
}

} // namespace

int Logger::LogHtmlGen(std::string dbPath, std::string second, std::string outPath) const {
    if (dbPath.empty() || second.empty() || outPath.empty())
        return kelo::Fail(KELO_FAILURE_ARGUMENT, outPath, "LogHtmlGen", "an empty argument");
    const std::list<_SSYSLOG_LOG_LOG_tag> events = LogEnum(dbPath, 0, 0);
    if (events.empty())
        return 0;
    const File page(std::fopen(outPath.c_str(), "w+"));
    tzset(); // localtime_r alone would not notice that TZ or the machine's time zone has changed
    if (page != nullptr)
        WritePage(page.get(), events);
    return 0;
}

int Logger::LogHtmlRemove(std::string path) const {
    if (path.empty())
        return kelo::Fail(KELO_FAILURE_ARGUMENT, "", "LogHtmlRemove", "an empty path");
    return unlink(path.c_str()) == 0 ? 0 : kelo::FailWithErrno(path, "LogHtmlRemove", errno);
}
