#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace kelo::platform {

// The texts that every text which a pattern matches contains, whatever their letter case.

// Of a LIKE pattern. `escape` is the character of its ESCAPE clause, NUL for none.
std::vector<std::string> LiteralsOfLike(std::string_view pattern, char escape);

// Of a GLOB pattern.
std::vector<std::string> LiteralsOfGlob(std::string_view pattern);

} // namespace kelo::platform
