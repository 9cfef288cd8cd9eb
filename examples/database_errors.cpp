// Results and reports of a handler: a wrong statement, a use out of order, and a damaged database.

#include <keloplatform/root.h>
#include <kelosyslog/dbhandler.h>
#include <kelosyslog/root.h>
#include <syslog.h>

#include <filesystem>
#include <fstream>
#include <iostream>

int main(int argc, char **argv) {
    if (argc != 2 || SyslogRootSet(argv[1]) != 0 || KELORootSet(argv[1]) != 0)
        return 2;
    openlog("example", LOG_PERROR, LOG_USER);
    const std::string root = argv[1];
    const std::string path = root + "/var/log/kelosyslog/logs.db";
    DBHandler db(path, root + "/usr/kelo/syslog/schema/logs.sql");

    std::cout << "not connected: " << db.DBTranStart() << "\n";
    if (db.DBCon() != 0)
        return 1;
    std::cout << "wrong statement: " << db.DBExecute("SELECT nothing FROM logs", nullptr, nullptr) << "\n";
    std::cout << "has table logs: " << db.DBcheckTableExist("logs") << "\n";
    std::cout << "end without a start: " << db.DBTranEnd() << "\n";
    db.DBDiscon();

    // A faulty disk: everything after the first page is overwritten.
    const auto size = std::filesystem::file_size(path);
    std::fstream file(path, std::ios::in | std::ios::out | std::ios::binary);
    file.seekp(4096);
    file << std::string(size - 4096, '\xff') << std::flush;

    std::cout << "open it again: " << db.DBCon() << "\n"; // only a statement detects the damage
    std::cout << "select: " << db.DBExecute("SELECT * FROM logs", nullptr, nullptr) << "\n";
    std::cout << "put aside: " << std::filesystem::exists(path + ".corrupt") << "\n";
    db.DBDiscon(); // this connection still has the damaged file: close it first

    std::cout << "a fresh one: " << db.DBCon() << ", logs: " << db.DBLogCountGet() << "\n";
    db.DBDiscon();
}
