// Why a function failed: a missing database, a damaged one, and a wrong statement.

#include <keloplatform/root.h>
#include <kelosyslog/dbhandler.h>
#include <kelosyslog/dbutil.h>
#include <kelosyslog/failure.h>
#include <kelosyslog/root.h>

#include <fstream>
#include <iostream>

namespace {

const char *Describe(KELOFAILUREKIND kind) {
    switch (kind) {
    case KELO_FAILURE_BUSY:
        return "busy, try again later";
    case KELO_FAILURE_MISSING:
        return "missing";
    case KELO_FAILURE_DAMAGED:
        return "damaged";
    case KELO_FAILURE_COLUMN:
        return "wrong statement";
    default:
        return "failed";
    }
}

// Each thread has its own last failure. Functions that succeed leave it alone: look at it only after a
// failure.
void Explain() {
    const KELOFAILURE &failure = *SyslogFailureGet();
    std::cout << Describe(failure.kind) << ": " << failure.text << "\n  path: " << failure.path << "\n";
}

} // namespace

int main(int argc, char **argv) {
    if (argc != 2 || SyslogRootSet(argv[1]) != 0 || KELORootSet(argv[1]) != 0)
        return 2;
    const std::string root = argv[1];
    if (SyslogDBSelectCount(root + "/nothing.db", {}, nullptr, nullptr) < 0)
        Explain();

    std::ofstream(root + "/text.db") << std::string(4096, 'x');
    if (SyslogDBSelectCount(root + "/text.db", {}, nullptr, nullptr) < 0)
        Explain();

    DBHandler db(root + "/var/log/kelosyslog/logs.db", root + "/usr/kelo/syslog/schema/logs.sql");
    if (db.DBCon() != 0)
        return 1;
    if (db.DBExecute("SELECT colour FROM logs", nullptr, nullptr) < 0)
        Explain();
    db.DBDiscon();
}
