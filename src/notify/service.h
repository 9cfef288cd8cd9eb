#pragma once

#include <optional>
#include <string>

#include "keloplatform/torvc.h"

namespace kelo {

// Bytes of an escaped content with its terminator.
inline constexpr int kContentSize = 2048;

// Passes a notification to the appliance's service. Returns its result: below 0 for failure.
int SendToService(const char *tag, TORVSZHASH **hash);

// `content` escaped as the text templates require; nothing when that takes kContentSize bytes or more.
std::optional<std::string> EscapeContent(const char *content);

} // namespace kelo
