#pragma once

namespace kelo {

// The statements of the shipped schema logs.sql that create its table and indexes.
extern const char *const kLogTables;

} // namespace kelo
