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

bool Reception::Stop() const {
    const bool isReceiving = IsThere(link_);
    if (isReceiving)
        Rename(link_, stopped_);
    return isReceiving;
}

bool Reception::Resume() const {
    const bool isStopped = IsStopped();
    if (isStopped)
        Rename(stopped_, link_);
    return isStopped;
}

void Reception::Rename(const std::string &from, const std::string &to) {
    if (std::rename(from.c_str(), to.c_str()) != 0 || !SyncFolderOf(to))
        throw OutputError("cannot rename " + from + " to " + to + ": " + std::strerror(errno));
    if (KELOSystemdReload("syslog-ng"))
        return;
    const std::string reason = KELOErrorGet();
    std::rename(to.c_str(), from.c_str());
    throw OutputError(reason);
}

} // namespace kelo::tool
