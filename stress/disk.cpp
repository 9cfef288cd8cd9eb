#include "disk.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <filesystem>

#include "base/files.h"

namespace kelo::stress {
namespace fs = std::filesystem;

// In a name space of its own, so that it disappears with the last process.
Disk::Disk(const Site &site)
    : filler_(site.Root() + "/filler"),
      isMounted_(fs::create_directories(site.Root()) && unshare(CLONE_NEWNS) == 0 &&
                 mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0 &&
                 mount("tmpfs", site.Root().c_str(), "tmpfs", 0, "size=48m") == 0) {
    const std::string root = site.Root();
    for (const char *folder :
         {"/usr/kelo/syslog", "/usr/kelo/etc", "/usr/kelo/keloman/webman/modules/Quillbay",
          "/var/log/kelosyslog", "/var/log/kelolog", "/var/spool/kelonotify"})
        fs::create_directories(root + folder);
    fs::create_directory(site.Copies());
    fs::create_directory(site.folder + "/run");
    fs::create_directory_symlink(KELO_SCHEMAS, root + "/usr/kelo/syslog/schema");
    fs::create_directory_symlink(KELO_TEXTS, root + "/usr/kelo/keloman/webman/modules/Quillbay/texts");
    fs::create_directory_symlink("../run", root + "/run"); // a pid file can always be written
}

void Disk::Fill(size_t left) {
    const tool::FileHandle file(open(filler_.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600));
    struct statvfs status {};
    if (!file || statvfs(filler_.c_str(), &status) != 0)
        return;
    const size_t free = status.f_bavail * status.f_bsize;
    // What others take at the same moment is theirs: fails where there is less.
    if (free > left && posix_fallocate(file.Get(), 0, static_cast<off_t>(free - left)) != 0) {
        const std::string block(4096, 'x');
        while (tool::WriteAll(file.Get(), block)) {
        }
    }
}

void Disk::Empty() {
    unlink(filler_.c_str());
}

} // namespace kelo::stress
