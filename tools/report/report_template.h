#pragma once

namespace kelo::tool {

// The text of report.html.mustache.
extern const char *const kReportTemplate;

} // namespace kelo::tool
