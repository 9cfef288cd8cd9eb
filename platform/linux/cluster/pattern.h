#pragma once

#include <string>
#include <string_view>

namespace kelo::platform {

// Conditions of the engine for those of SQLite. `column` is an expression of the engine; texts are UTF-8
// without NUL. All throw ClusterError for what has no equivalent.

// A text as a literal of the engine.
std::string EngineText(std::string_view text);

// column GLOB pattern. A set in brackets holds one character.
std::string GlobCondition(const std::string &column, std::string_view pattern);

// column LIKE pattern, with the backslash as its escape character if `hasEscape`: ASCII letters match in
// either case.
std::string LikeCondition(const std::string &column, std::string_view pattern, bool hasEscape);

// regexp(regex, column), regexpi(regex, column).
std::string RegexCondition(const std::string &column, std::string_view regex, bool ignoreCase);

} // namespace kelo::platform
