#pragma once

#include <string_view>

#include "keloplatform/torvc.h"

namespace kelo::platform {

// Appends a copy of `text`, which holds no NUL byte. Throws std::bad_alloc, and then the list is as before.
void ListAppend(TORVSZLIST &list, std::string_view text);

} // namespace kelo::platform
