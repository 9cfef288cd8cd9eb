#include "base/folder_owner.h"

#include <fcntl.h>
#include <grp.h>
#include <linux/capability.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <exception>
#include <filesystem>

#include "base/files.h"

namespace kelo::tool {
namespace {

// Of the folder, or the nearest existing one above it.
struct stat FolderOf(const std::string &path) {
    struct stat status {};
    std::filesystem::path folder = std::filesystem::path(path).parent_path();
    while (stat(folder.c_str(), &status) != 0 && folder.has_relative_path())
        folder = folder.parent_path();
    return status;
}

bool MayBecomeOthers() {
    return geteuid() == 0 && prctl(PR_CAPBSET_READ, CAP_SETUID) == 1 &&
           prctl(PR_CAPBSET_READ, CAP_SETGID) == 1;
}

[[noreturn]] void RunAs(const struct stat &owner, const std::function<std::string()> &work, int answer) {
    std::string reason;
    try {
        if (setgroups(0, nullptr) == 0 && setresgid(owner.st_gid, owner.st_gid, owner.st_gid) == 0 &&
            setresuid(owner.st_uid, owner.st_uid, owner.st_uid) == 0)
            reason = work();
        else
            reason = std::strerror(errno);
    } catch (const std::exception &error) {
        reason = error.what();
    }
    _exit(WriteAll(answer, reason) ? 0 : 1);
}

std::string ReadAll(int fd) {
    std::string text;
    char block[512];
    for (ssize_t size; (size = read(fd, block, sizeof block)) != 0;) {
        if (size > 0)
            text.append(block, static_cast<size_t>(size));
        else if (errno != EINTR)
            break;
    }
    return text;
}

} // namespace

std::string AsOwnerOfFolder(const std::string &path, const std::function<std::string()> &work) {
    const struct stat owner = FolderOf(path);
    if (owner.st_uid == geteuid() || !MayBecomeOthers())
        return work();
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0)
        return std::strerror(errno);
    const FileHandle reading(ends[0]);
    FileHandle writing(ends[1]);
    const pid_t child = fork();
    if (child == 0)
        RunAs(owner, work, writing.Get());
    if (child < 0)
        return std::strerror(errno);
    writing = FileHandle();
    const std::string reason = ReadAll(reading.Get());
    int status = 0;
    while (waitpid(child, &status, 0) < 0 && errno == EINTR) {
    }
    return reason.empty() && status != 0 ? "the process of the folder's owner has failed" : reason;
}

} // namespace kelo::tool
