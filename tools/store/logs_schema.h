#pragma once

namespace kelo::tool {

// The text of the shipped schema logs.sql.
extern const char *const kLogsSchema;
// What it creates, without the transaction around it.
extern const char *const kLogsTables;

} // namespace kelo::tool
