#pragma once

namespace kelo::tool {

// What the shipped schema archive.sql creates, without the transaction around it.
extern const char *const kArchiveTables;

} // namespace kelo::tool
