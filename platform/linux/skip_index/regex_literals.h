#pragma once

#include <string>
#include <vector>

namespace kelo::platform {

// The texts, in lower case, that every text contains in which a regex is found: all of one of the lists.
// Empty if the regex requires none. Texts with the letters that RE2 folds to ASCII ones (U+017F, U+212A) may
// match without.
std::vector<std::vector<std::string>> LiteralsOfRegex(const std::string &regex, bool ignoreCase);

} // namespace kelo::platform
