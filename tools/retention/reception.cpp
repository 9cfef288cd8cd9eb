#include "retention/reception.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstdio>
#include <cstring>

#include "base/atomic_file.h"
#include "base/errors.h"
#include "keloplatform/errors.h"
#include "keloplatform/kelosystem.h"

namespace kelo::tool {
namespace {

bool IsThere(const std::string &path) {
    struct stat status {};
    return lstat(path.c_str(), &status) == 0;
}

} // namespace

Reception::Reception(const std::string &root)
    : link_(root + "/etc/syslog-ng/conf.d/kelosyslog.conf"), stopped_(link_ + ".stopped") {}

bool Reception::IsStopped() const {
    return IsThere(stopped_) && !IsThere(link_);
}

bool Reception::Rename(const std::string &from, const std::string &to) {
    if (!IsThere(from))
        return false;
    if (!RenameToFreeName(from, to) || !SyncFolderOf(to))
        throw OutputError("cannot rename " + from + " to " + to + ": " + std::strerror(errno));
    if (KELOSystemdReload("syslog-ng"))
        return true;
    const std::string reason = KELOErrorGet();
    RenameToFreeName(to, from);
    throw OutputError(reason);
}

} // namespace kelo::tool
