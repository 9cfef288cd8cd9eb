#pragma once

#include <list>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "read/event_log.h"
#include "report/log_figures.h"

namespace kelo::tool {

// Counts of the accounting database, taken when the records were received.
struct AccountingFigures {
    std::vector<int64_t> peaks; // largest sample, by span of the grid of LogFigures; empty for none
    std::map<std::string, uint64_t> devices; // with the highest counts, over all time
};

// The content of a report. Texts are unchanged from the databases.
struct Report {
    std::string logDatabase;
    std::string eventDatabase;
    std::string program; // name and version of the program
    int64_t now = 0;
    Period period;
    LogFigures logs;
    std::optional<std::list<Event>> events; // in the period, newest first; none without an event database
    size_t mostEvents = 0;                  // listed ones
    AccountingFigures accounting;
};

// The report as one HTML page that loads nothing, runs nothing and escapes every text. Its charts are inline
// SVG; it follows the reader's light or dark scheme and the width of the screen or paper.
std::string RenderReport(const Report &report);

} // namespace kelo::tool
