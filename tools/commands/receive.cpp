// kelosyslog receive: counts, checks and stores the messages of syslog-ng.

#include <fcntl.h>
#include <sys/file.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <system_error>

#include "base/errors.h"
#include "cli/exit_status.h"
#include "cli/program.h"
#include "commands/commands.h"
#include "read/log_table.h"
#include "receive/receiver.h"
#include "receive/spool_receiver.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter =
    "The standard input is log text as in 'kelosyslog parse', from a program() destination of syslog-ng.\n"
    "SIGHUP reopens the files and loads the rules anew; SIGTERM ends when the input pauses.\n\n"
    "Examples:\n"
    "  kelosyslog receive                                  count the logs and check them against the rules\n"
    "  kelosyslog receive --db /var/log/kelosyslog/logs.db    store them too\n"
    "  kelosyslog receive --spool /var/spool/kelosyslog --db /var/log/kelosyslog/logs.db\n"
    "                                                      the same out of the message spool\n\n"
    "Exit status: 0 the input ended, 2 usage, 4 the input cannot be read.";

struct Options {
    ReceiverOptions receiver;
    std::string notifyLimit = "10";
    std::string deviceLimit = "10000";
    bool verbose = false;
};

// Held as long as the program runs: two receivers would overwrite each other's counts. After a restart of
// syslog-ng the old one may still be storing; its end is awaited.
FileHandle LockAgainstOthers(const std::string &root) {
    const std::filesystem::path path = root + "/run/kelosyslog/receive.lock";
    std::error_code ignored; // opening fails then, and says why
    std::filesystem::create_directories(path.parent_path(), ignored);
    FileHandle file(open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (file && flock(file.Get(), LOCK_EX | LOCK_NB) == 0)
        return file;
    if (file && errno == EWOULDBLOCK) {
        syslog(LOG_NOTICE, "waiting for another receiver to end: %s", path.c_str());
        while (flock(file.Get(), LOCK_EX) != 0 && errno == EINTR) {
        }
        return file;
    }
    syslog(LOG_WARNING, "cannot lock %s: %s", path.c_str(), std::strerror(errno));
    return file;
}

int RunOnSpool(const ReceiverOptions &options) {
    if (options.database.empty())
        throw UsageError("--spool needs --db");
    try {
        SpoolReceiver(options).Run();
    } catch (const std::system_error &error) {
        syslog(LOG_ERR, "%s", error.what());
        throw OutputError(error.what());
    }
    return kExitFound;
}

int Run(Options options, const std::string &root) {
    options.receiver.root = root;
    options.receiver.indexer = "/proc/self/exe";
    RequireDatabase(options.receiver.database, "receive --db");
    options.receiver.notifyLimit = ParseNumber("--notify-limit", options.notifyLimit, 1, 100'000);
    options.receiver.deviceLimit = ParseNumber("--device-limit", options.deviceLimit, 1, 10'000'000);
    // A limit of the file size is handled like a full disk.
    std::signal(SIGXFSZ, SIG_IGN);
    openlog("kelosyslog", LOG_PID | (options.verbose ? LOG_PERROR : 0), LOG_DAEMON);
    const FileHandle lock = LockAgainstOthers(root);
    if (!options.receiver.spool.empty())
        return RunOnSpool(options.receiver);
    try {
        Receiver(options.receiver).Run(STDIN_FILENO);
    } catch (const std::system_error &error) {
        syslog(LOG_ERR, "standard input: %s", error.code().message().c_str());
        throw OutputError("standard input: " + error.code().message());
    }
    return kExitFound;
}

} // namespace

void AddReceive(Program &program) {
    auto options = std::make_shared<Options>();
    Command command = AddSubcommand(program, "receive", "Receive log text from syslog-ng",
                                    [options, &program] { return Run(*options, program.root); });
    command.Footer(kFooter);
    command.AddText("--db", options->receiver.database, "PATH",
                    "Store into table logs of this database, which is created when missing");
    command.AddText("--spool", options->receiver.spool, "FOLDER",
                    "Receive from the files of this message spool, not the standard input; needs --db");
    command.AddText("--set-aside", options->receiver.setAside, "FILE",
                    "Keep lines that give no log here (/var/log/kelolog/set-aside.log)");
    command.AddText(
        "--notify-limit", options->notifyLimit, "N",
        "Raise at most N notifications a minute for a keyword, a severity or the rate, 5 N for all of "
        "them (10)");
    command.AddText(
        "--device-limit", options->deviceLimit, "N",
        "Count the logs of at most N devices each by its name, those of others as (others) (10000)");
    command.AddFlag("-v,--verbose", options->verbose,
                    "Write to the standard error, too, what goes to the system log");
}

} // namespace kelo::tool
