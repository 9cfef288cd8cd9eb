#include "accounting/accounting_fixture.h"

#include <dlfcn.h>

namespace kelo::test {

Machine machine;

AccountingTest::AccountingTest() {
    machine = {};
    std::filesystem::create_directories(root_.File("var/log/kelolog"));
    std::filesystem::create_directories(root_.File("usr/kelo/etc"));
    CreateLogDatabase(path_, "accinfo.sql");
    CreateLogDatabase(root_.File("usr/kelo/etc/kelosyslog.db"), "kelosyslog.sql");
    WriteRules("");
}

std::string AccountingTest::Samples() const {
    return QueryText(path_, "SELECT group_concat(stamp || ' ' || device || ' ' || eps, ';') FROM (SELECT * "
                            "FROM eps ORDER BY id)");
}

std::string AccountingTest::Histogram() const {
    return QueryText(path_, "SELECT group_concat(device || ' ' || count, ';') FROM (SELECT * FROM histogram "
                            "ORDER BY device)");
}

} // namespace kelo::test

using kelo::test::machine;

extern "C" {

time_t time(time_t *seconds) noexcept {
    if (seconds != nullptr)
        *seconds = machine.now;
    return machine.now;
}

int sqlite3_step(sqlite3_stmt *statement) {
    static const auto real = reinterpret_cast<decltype(&sqlite3_step)>(dlsym(RTLD_NEXT, "sqlite3_step"));
    if (machine.beforeStep)
        machine.beforeStep();
    return real(statement);
}

} // extern "C"
