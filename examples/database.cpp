// Creates a database from its schema, fills it in a transaction, reads it back and keeps its metadata.

#include <keloplatform/kelodb.h>
#include <kelosyslog/dbhandler.h>
#include <syslog.h>

#include <iostream>

// Receives the result, which stays the handler's own: copy what you need after the call.
int PrintRows(DBResult_tag *result, void *context) {
    auto &count = *static_cast<int *>(context);
    for (unsigned int row = 0; KELODBFetchRow(result, &row) == 0; ++count)
        std::cout << "  " << KELODBFetchField(result, row, "host") << ": "
                  << KELODBFetchField(result, row, "msg") << "\n";
    return 0;
}

int main(int argc, char **argv) {
    if (argc != 2)
        return 2;
    openlog("example", LOG_PERROR, LOG_USER);
    const std::string root = argv[1];
    DBHandler db(root + "/var/log/kelolog/archive.db", root + "/usr/kelo/syslog/schema/archive.sql");
    if (db.DBCon() != 0) // creates missing folders, the file and its tables
        return 1;

    const std::string text = db.DBCmdEscape("it's done"); // for use between single quotes
    db.DBTranStart();
    std::cout << "in transaction: " << db.isInTran() << "\n";
    db.DBExecute("INSERT INTO logs (host, utcsec, msg) VALUES ('nas', 1577931072, '" + text + "')");
    db.DBExecute("INSERT INTO logs (host, utcsec, msg) VALUES ('web1', 1577934672, 'back online')");
    std::cout << "committed: " << db.DBTranEnd() << "\n";

    int count = 0;
    db.DBExecute("SELECT host, msg FROM logs ORDER BY id", PrintRows, &count);
    std::cout << count << " rows, from " << db.DBInfoStartStrGet() << "\n";

    // The program that creates an archive writes the row that describes it.
    db.DBInfoStartSet(static_cast<unsigned long long>(db.DBLogStartTimeGet()));
    db.DBInfoEndSet(static_cast<unsigned long long>(db.DBLogEndTimeGet()));
    db.DBInfoDevSet("nas");
    _ARCH_DB_INFO_tag info;
    if (db.DBInfoGet(info) == 0)
        std::cout << info.device << " " << info.start_time << " to " << info.end_time << "\n";
    db.DBDiscon(); // the destructor does not
}
