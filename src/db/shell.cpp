#include "db/shell.h"

#include "keloplatform/torvc.h"

namespace kelo {

bool RunShell(const std::string &commandLine) {
    return TORVCExec("/bin/sh", "-c", commandLine.c_str(), nullptr, nullptr) >= 0;
}

} // namespace kelo
