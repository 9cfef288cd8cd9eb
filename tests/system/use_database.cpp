// Works through a handler on a database that syslog-ng writes, until its standard input ends: use_database
// ROOT DATABASE. Ends with 0 then; with 3 as soon as a statement fails and the file was put aside. What it
// reports as an error is on the standard error.

#include <poll.h>
#include <syslog.h>
#include <unistd.h>

#include <cstdio>
#include <string>

#include "keloplatform/root.h"
#include "kelosyslog/dbhandler.h"
#include "kelosyslog/root.h"

namespace {

bool HasInputEnded() {
    pollfd input{STDIN_FILENO, POLLIN, 0};
    char byte;
    return poll(&input, 1, 0) > 0 && read(STDIN_FILENO, &byte, 1) <= 0;
}

// One of everything, up to a query that fails: with the file put aside, a further statement would put the
// fresh one aside too. The transaction changes a row into what it is, so that the rows stay those sent.
bool Use(DBHandler &db) {
    if (db.DBExecute("SELECT count(*), max(length(msg)), max(id) FROM logs NOT INDEXED") != 0)
        return false;
    if (db.DBTranStart() == 0) {
        const bool isDone =
            db.DBExecute("UPDATE logs SET tag = tag || '' WHERE id = (SELECT max(id) FROM logs)") == 0;
        isDone ? db.DBTranEnd() : db.DBTranRollback();
    }
    return db.DBWalCheckpoint(false) == 0;
}

} // namespace

int main(int argc, char **argv) {
    if (argc != 3 || SyslogRootSet(argv[1]) != 0 || KELORootSet(argv[1]) != 0)
        return 2;
    openlog("use_database", LOG_PERROR, LOG_USER);
    setlogmask(LOG_UPTO(LOG_ERR));
    const std::string path = argv[2];
    DBHandler db(path, "");
    int rounds = 0;
    while (!HasInputEnded()) {
        if (!db.isConnected() && db.DBCon() != 0)
            return 1;
        const bool isSound = Use(db);
        if (!isSound)
            db.DBDiscon();
        if (!isSound && access((path + ".corrupt").c_str(), F_OK) == 0)
            return 3;
        ++rounds;
    }
    db.DBDiscon();
    std::printf("%d\n", rounds);
    return 0;
}
