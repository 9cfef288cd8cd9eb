// Processes that store, find, count, delete and archive on the same databases while they are killed, their
// disk fills and their files are damaged. Every token that was acknowledged must be found at the end.
//
//     stress [--seconds N] [--seed S]
//
// Exit status: 0 nothing wrong, 1 a fault (the folder is kept), 2 wrong usage.

#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>

#include "keloplatform/root.h"
#include "kelosyslog/root.h"
#include "run.h"

namespace kelo::stress {
namespace {

namespace fs = std::filesystem;

// Returns the exit status.
int RunIn(const std::string &folder, const Options &options) {
    const Site site{folder};
    for (const std::string &path : {site.Ledgers(), site.Attic()})
        fs::create_directory(path);
    SyslogRootSet(site.Root());
    KELORootSet(site.Root().c_str());
    setenv("TZ", "UTC0", 1);
    if (Run(site, options))
        return 0;
    // The disk is gone with this process.
    fs::copy(site.Root(), folder + "/disk-at-end",
             fs::copy_options::recursive | fs::copy_options::skip_symlinks);
    return 1;
}

bool Parse(int count, char **arguments, Options &options) {
    for (int i = 1; i < count; i += 2) {
        char *end = nullptr;
        const uint64_t value = i + 1 < count ? std::strtoull(arguments[i + 1], &end, 10) : 0;
        if (end == nullptr || *end != '\0' || end == arguments[i + 1])
            return false;
        if (std::strcmp(arguments[i], "--seconds") == 0)
            options.seconds = static_cast<int64_t>(value);
        else if (std::strcmp(arguments[i], "--seed") == 0)
            options.seed = value;
        else
            return false;
    }
    return true;
}

} // namespace
} // namespace kelo::stress

// The run has a process of its own, which leads a session and mounts a disk.
int main(int count, char **arguments) {
    kelo::stress::Options options;
    if (!kelo::stress::Parse(count, arguments, options)) {
        std::fprintf(stderr, "usage: stress [--seconds N] [--seed S]\n");
        return 2;
    }
    std::setvbuf(stdout, nullptr, _IOLBF, 0);
    std::string folder = (std::filesystem::temp_directory_path() / "kelosyslog-stress-XXXXXX").string();
    if (mkdtemp(folder.data()) == nullptr) {
        std::perror(folder.c_str());
        return 2;
    }
    const pid_t process = fork();
    if (process == 0) {
        prctl(PR_SET_PDEATHSIG, SIGKILL);
        setsid();
        std::exit(kelo::stress::RunIn(folder, options));
    }
    int status = 0;
    waitpid(process, &status, 0);
    if (status == 0)
        std::filesystem::remove_all(folder);
    else
        std::printf("FAILED; see %s\n", folder.c_str());
    return status == 0 ? 0 : 1;
}
