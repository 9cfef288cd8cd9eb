// kelosyslog: searches and maintains the records of a log server.

#include <csignal>

#include "commands/commands.h"

int main(int argc, char **argv) {
    // A reader that closes its end is detected by the failing write.
    std::signal(SIGPIPE, SIG_IGN);

    kelo::tool::KelosyslogProgram program(argc > 1 ? argv[1] : "");
    return kelo::tool::RunProgram(program, argc, argv);
}
