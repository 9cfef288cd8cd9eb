#pragma once

namespace kelo::platform {

// Clears the calling thread's last failure. The functions that KELOErrorGet describes call it first.
void ClearFailure();

// Writes a line to the system log (LOG_ERR; `format` as for syslog(3), "%m" included) and keeps it for
// KELOErrorGet. A line is cut to 4 KiB. Allocates nothing.
[[gnu::format(printf, 1, 2)]] void ReportFailure(const char *format, ...);

} // namespace kelo::platform
