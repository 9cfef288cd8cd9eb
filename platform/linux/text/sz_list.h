#pragma once

#include <string_view>

#include "keloplatform/torvc.h"

namespace kelo::platform {

// Appends a copy of `text`, which has no NUL byte. Throws std::bad_alloc and then leaves the list unchanged.
void ListAppend(TORVSZLIST &list, std::string_view text);

} // namespace kelo::platform
