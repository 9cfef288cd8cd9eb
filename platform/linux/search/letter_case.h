#pragma once

#include <string_view>

namespace kelo::platform {

// Whether the text has an ASCII capital letter.
bool HasCapitals(std::string_view text);

// Whether a regex has a literal ASCII capital letter. Those of escapes (\S, \pL, \p{Greek},
// \x1B), of group names and of flags do not count.
bool RegexHasCapitals(std::string_view regex);

} // namespace kelo::platform
