#pragma once

#include <string>
#include <vector>

#include "print/record_formatter.h"

namespace kelo::tool {

struct ForgetOptions {
    std::vector<std::string> names; // with the wildcards * and ?; empty: any
    std::string below;              // only devices with fewer records; empty: any number
    bool isDryRun = false;
    bool isConfirmed = false;
    OutputFormat format = OutputFormat::Text; // or Json
};

// kelosyslog stats forget: removes devices from the accounting database at `path`, after asking, and makes a
// receiver of `root` forget them. Returns an exit status. Throws UsageError, DatabaseError.
int ForgetDevicesByOptions(const std::string &path, const ForgetOptions &options, const std::string &root);

} // namespace kelo::tool
