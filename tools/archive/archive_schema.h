#pragma once

namespace kelo::tool {

// The text of the shipped schema archive.sql.
extern const char *const kArchiveSchema;

} // namespace kelo::tool
