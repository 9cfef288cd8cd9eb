#pragma once

namespace kelo::tool {

// The text of the shipped schema logs.sql.
extern const char *const kLogsSchema;

} // namespace kelo::tool
