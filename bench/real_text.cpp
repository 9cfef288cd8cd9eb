#include "real_text.h"

#include <unistd.h>

#include <cstdio>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <random>
#include <sstream>

#include "support/account_database.h"
#include "support/measure.h"

namespace kelo::bench {
namespace {

namespace fs = std::filesystem;

class Writer {
public:
    std::string Message(int number) {
        std::string text = Usual();
        if (number % 100'000 == 777)
            text += " Segfault at 0";
        if (number % 1'000 == 5)
            text += ", Zustand unverändert";
        return text;
    }
    unsigned Below(unsigned count) { return static_cast<unsigned>(engine_() % count); }

private:
    std::string Number(unsigned count) { return std::to_string(Below(count)); }
    std::string Address() { return "10." + Number(256) + "." + Number(256) + "." + Number(256); }

    std::string Usual() {
        switch (Below(6)) {
        case 0:
            return "Accepted publickey for user" + Number(97) + " from " + Address() + " port " +
                   Number(65'536) + " ssh2: ED25519 SHA256:" + Token(43);
        case 1:
            return "\"GET /shop/item/" + Number(100'000) + " HTTP/1.1\" 200 " + Number(30'000) +
                   " \"https://example.com/\" \"Mozilla/5.0 (X11; Linux x86_64)\"";
        case 2:
            return "[ufw block] IN=eth0 OUT= MAC= SRC=" + Address() + " DST=10.0.0.1 LEN=" + Number(1'500) +
                   " TTL=64 PROTO=TCP SPT=" + Number(65'536) + " DPT=" + Number(1'024);
        case 3:
            return "session " + Token(12) + " of " + Address() + " closed by remote host after " +
                   Number(100'000) + " ms, " + Number(1'000'000) + " bytes";
        case 4:
            return "Device /dev/sd" + std::string(1, static_cast<char>('a' + Below(26))) +
                   " [SAT], SMART usage attribute: 194 temperature changed from " + Number(80) + " to " +
                   Number(80);
        default:
            return "(root) CMD (/usr/local/bin/job" + Number(200) + " --id " + Number(1'000'000) + ")";
        }
    }
    std::string Token(int size) {
        constexpr char kLetters[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789";
        std::string token;
        for (; size > 0; --size)
            token += kLetters[Below(sizeof kLetters - 1)];
        return token;
    }

    std::mt19937 engine_{1};
};

std::string FormattedTime(time_t moment, const char *format) {
    tm parts{};
    gmtime_r(&moment, &parts);
    char text[32];
    return {text, std::strftime(text, sizeof text, format, &parts)};
}

void Make(const std::string &path, int rows) {
    std::ostringstream schema;
    schema << std::ifstream(KELO_LOGS_SCHEMA).rdbuf();
    const Database db = OpenDatabase(path);
    Run(db.get(), "PRAGMA synchronous=OFF;" + schema.str() + "BEGIN");
    const Query insert = Prepare(
        db.get(), "INSERT INTO logs(host, ip, fac, prio, llevel, tag, utcsec, tzoffset, ldate, ltime, "
                  "prog, msg) VALUES(?,?,'daemon',?3,?3,'1e',?4,'+00:00',?5,?6,?7,?8)");
    std::ofstream text(path + ".txt", std::ios::binary);
    Writer writer;
    for (int number = 0; number < rows; ++number) {
        const time_t moment = 1'577'836'800 + time_t{number} * 60 / 200;
        const std::string host = std::to_string(writer.Below(50));
        const std::string values[] = {"server" + host,
                                      "192.168.1." + host,
                                      number % 20'000 == 3    ? "emerg"
                                      : writer.Below(40) == 0 ? "err"
                                                              : "info",
                                      std::to_string(moment),
                                      FormattedTime(moment, "%Y/%m/%d"),
                                      FormattedTime(moment, "%H:%M:%S"),
                                      "program" + std::to_string(writer.Below(30)),
                                      writer.Message(number)};
        for (int column = 0; column < 8; ++column) {
            const std::string &value = values[column];
            sqlite3_bind_text(insert.get(), column + 1, value.data(), static_cast<int>(value.size()),
                              SQLITE_STATIC);
        }
        if (sqlite3_step(insert.get()) != SQLITE_DONE)
            Fail(path + ": " + sqlite3_errmsg(db.get()));
        sqlite3_reset(insert.get());
        text << values[7] << "\n";
    }
    Run(db.get(), "COMMIT; PRAGMA wal_checkpoint(TRUNCATE)");
}

} // namespace

std::string RealTextDatabase(int rows) {
    const fs::path folder = fs::temp_directory_path() / ("kelosyslog-bench-" + std::to_string(getuid()));
    fs::create_directories(folder);
    fs::permissions(folder, fs::perms::owner_all);
    std::string path = folder / ("text-" + std::to_string(rows) + ".db");
    if (!fs::exists(path + ".txt") || !fs::exists(path)) {
        const std::string unfinished = folder / ("text-" + std::to_string(getpid()) + ".db");
        Make(unfinished, rows);
        fs::rename(unfinished + ".txt", path + ".txt");
        fs::rename(unfinished, path);
    }
    return path;
}

} // namespace kelo::bench
