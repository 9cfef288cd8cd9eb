#pragma once

#include "kelosyslog/accounting.h"
#include "notify/notify_fixture.h"
#include "support/short_lock_waits.h"

namespace kelo::test {

// What replaces the machine for the whole program.
struct Machine {
    time_t now = 1000;
    // Called before every step of an SQLite statement.
    std::function<void()> beforeStep;
};
extern Machine machine;

// An accounting database and an event database of the shipped schemas under a root of its own, no rules, and
// a clock that only the test advances.
class AccountingTest : public NotifyTest {
protected:
    AccountingTest();
    ~AccountingTest() override { machine = {}; }

    // The rows of table "eps" in the order of their insertion: "stamp device eps;..."
    std::string Samples() const;
    // The rows of table "histogram": "device count;..." in byte order.
    std::string Histogram() const;

    ShortLockWaits waits_;
    const std::string path_ = root_.File("var/log/kelolog/.KELOACCOUNTDB");
};

} // namespace kelo::test
