#include "kelonotify/options.h"

namespace kelo::tool {

void DeclareCommandLine(CLI::App &app, NotifierOptions &options) {
    app.name("kelonotify");
    app.description("Deliver the notifications that wait in the spool.");
    app.set_version_flag("--version", "kelonotify " KELOSYSLOG_VERSION);
    app.add_option("--root", options.root, "Work on the spool and the settings below DIR")->type_name("DIR");
    app.add_flag("--watch", options.mustStay, "Stay, and deliver what comes");
    app.add_option("--linger", options.lingerSec,
                   "Stay as long as the next attempt follows within SECONDS (0)")
        ->type_name("SECONDS")
        ->check(CLI::Range(0, 3600));
    app.add_option("--timeout", options.delivery.timeoutSec, "End a step on a network after SECONDS (30)")
        ->type_name("SECONDS")
        ->check(CLI::Range(1, 600));
    app.add_option("--give-up-after", options.delivery.giveUpAfterSec,
                   "Put what is not delivered at this age into failed/ (259200, three days)")
        ->type_name("SECONDS")
        ->check(CLI::Range(0, 31536000));
    app.footer("Exit status: 0 everything delivered, 1 something waits or was given up, 2 usage, 3 another "
               "instance delivers, 4 the spool cannot be read or written.");
}

} // namespace kelo::tool
