#pragma once

#include <sys/stat.h>

#include <memory>
#include <string>

#include "files/section_text.h"

namespace kelo::platform {

// The parsed content of the file at `path`; null with errno set when it cannot be read. May be called from
// any thread.
//
// The last file is kept and given again while its status is the same, so that reading a large file section by
// section does not read it whole each time. A file that changed in the clock tick in which it is read is not
// kept: a second change in that tick could not be seen.
std::shared_ptr<const SectionText> LoadSectionText(const std::string &path);

} // namespace kelo::platform
