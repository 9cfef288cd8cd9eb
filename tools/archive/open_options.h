#pragma once

#include "base/sqlite.h"

namespace kelo::tool {

// A source database may have any content, and the user may interrupt the work.
inline constexpr SqliteOptions kToRead{
    .mode = SqliteMode::kRead, .heedsStopSignals = true, .trustsSchema = false};
inline constexpr SqliteOptions kToWrite{
    .mode = SqliteMode::kWrite, .heedsStopSignals = true, .trustsSchema = false};

} // namespace kelo::tool
