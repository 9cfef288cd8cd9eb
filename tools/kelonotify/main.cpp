// kelonotify: delivers the notification spool.

#include <syslog.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <curl/curl.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <memory>

#include "base/errors.h"
#include "cli/command_line.h"
#include "kelonotify/deliverer.h"
#include "kelonotify/options.h"
#include "kelonotify/watcher.h"
#include "keloplatform/root.h"

namespace kelo::tool {
namespace {

enum ExitStatus : int {
    kExitDelivered = 0,
    kExitLeft = 1, // something waits, or was given up
    kExitUsage = 2,
    kExitBusy = 3, // another instance delivers
    kExitSpool = 4,
};

void WarnOfOpenSettings(const Settings &settings) {
    if (settings.IsOpenToOthers())
        syslog(LOG_WARNING, "%s holds passwords and may be read by everybody: give it mode 0640",
               settings.Path().c_str());
}

int Run(const NotifierOptions &options) {
    const Spool spool(options.root);
    const Settings settings(options.root);
    spool.CreateFolders();
    const FileHandle lock = spool.Lock();
    if (!lock) {
        syslog(LOG_NOTICE, "Another kelonotify delivers %s", spool.Path().c_str());
        return kExitBusy;
    }
    WarnOfOpenSettings(settings);
    Watcher watcher(spool.File("new"));
    Deliverer deliverer(spool, settings, options.delivery, [&] { return watcher.ShouldStop(); });
    int64_t next = deliverer.Pass();
    const auto mustWait = [&] { return options.mustStay || (next >= 0 && next <= options.lingerSec); };
    while (mustWait() && !watcher.ShouldStop()) {
        watcher.Wait(next);
        if (!watcher.ShouldStop())
            next = deliverer.Pass();
    }
    return deliverer.IsAllDelivered() ? kExitDelivered : kExitLeft;
}

void ApplyRoot(std::string &root) {
    if (root.empty())
        return;
    root = NormalRoot(root);
    if (KELORootSet(root.c_str()) != 0)
        throw UsageError("--root: cannot use '" + root + "'");
}

} // namespace

int Main(int argc, char **argv) {
    std::signal(SIGPIPE, SIG_IGN); // a server that goes away is noticed by the failing write
    // Where standard error is the journal each message would be there twice.
    const bool isInJournal = std::getenv("JOURNAL_STREAM") != nullptr;
    openlog("kelonotify", LOG_PID | (isInJournal ? 0 : LOG_PERROR), LOG_DAEMON);
    NotifierOptions options;
    CLI::App app;
    DeclareCommandLine(app, options);
    const ExitHandling exits = {
        kExitUsage, kExitSpool,
        [](const std::string &text) { std::fprintf(stderr, "kelonotify: %s\n", text.c_str()); },
        [](const std::string &text) { syslog(LOG_ERR, "%s", text.c_str()); }};
    return RunApp(app, exits, [&] {
        app.parse(argc, argv);
        ApplyRoot(options.root);
        curl_global_init(CURL_GLOBAL_DEFAULT);
        return Run(options);
    });
}

} // namespace kelo::tool

int main(int argc, char **argv) {
    return kelo::tool::Main(argc, argv);
}
