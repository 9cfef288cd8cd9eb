#pragma once

#include "base/sqlite.h"

namespace kelo::tool {

// Databases to be archived come from anywhere, and the user may break off the work.
inline constexpr SqliteOptions kToRead{
    .mode = SqliteMode::kRead, .heedsStopSignals = true, .trustsSchema = false};
inline constexpr SqliteOptions kToWrite{
    .mode = SqliteMode::kWrite, .heedsStopSignals = true, .trustsSchema = false};

} // namespace kelo::tool
