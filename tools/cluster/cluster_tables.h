#pragma once

namespace kelo::tool {

// The statements of schema/cluster.sql.
extern const char *const kClusterTables;

} // namespace kelo::tool
