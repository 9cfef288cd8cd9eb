#pragma once

#include <string>

namespace kelo {

// Writes `text` to the system log at priority LOG_ERR. Never interprets it as a format.
void ReportError(const std::string &text);

// The same in the form "SOURCE:LINE TEXT". The line is a constant of the message, not the line of the call.
void ReportErrorAt(const char *source, int line, const std::string &text);

} // namespace kelo
