#pragma once

#include <string>

namespace kelo::platform {

// Whether this thread takes answers that lack a part of a cluster (keloplatform/cluster.h).
bool ArePartialAnswersWanted();

// Notes for this thread that an answer lacked a part, and why.
void NoteMissingPart(const std::string &reason);

} // namespace kelo::platform
