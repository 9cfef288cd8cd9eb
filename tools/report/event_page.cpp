#include "report/event_page.h"

#include "base/text_encoding.h"
#include "base/time_format.h"

namespace kelo::tool {
namespace {

constexpr const char *kHead =
    "<!DOCTYPE html>\n"
    "<html><head>\n"
    "<meta charset=\"utf-8\">\n"
    "<meta http-equiv=\"Content-Security-Policy\" content=\"default-src 'none'; base-uri 'none'; form-action "
    "'none'\">\n"
    "<title>Syslog Server Log</title>\n"
    "</head>\n"
    "<body>\n"
    "<center><h2> Syslog Server Log </h2></center>\n"
    "<table border=1 width=95%>\n"
    "<tr>\n"
    "<th>Type</th><th>Time</th><th>User</th><th>Event</th></tr>\n";
constexpr size_t kSecondsEnd = 19; // of a time in ISO 8601; the offset is left out
constexpr const char *kTail = "</table></body></html>\n";

// A text from the database as one line without markup.
std::string Cell(const char *align, const std::string &text) {
    return std::string("<td align=\"") + align + "\">" + EscapeMarkup(EscapeForTerminal(text), "&<>\"'") +
           "</td>";
}

} // namespace

std::string RenderEventPage(const std::list<Event> &events) {
    const TimeFormat time(false);
    std::string page = kHead;
    for (const Event &event : events)
        page += "<tr>\n" + Cell("center", EventLevelName(event.level)) + "\n" +
                Cell("center", time.Iso(event.time).substr(0, kSecondsEnd)) + Cell("center", event.user) +
                Cell("left", event.event) + "</tr>\n";
    return page + kTail;
}

} // namespace kelo::tool
