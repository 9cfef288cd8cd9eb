#pragma once

#include <list>

#include "kelosyslog/dbutil.h"
#include "kelosyslog/failure.h"
#include "support/doubles.h"
#include "support/test.h"

namespace kelo::test {

extern time_t now; // what time(2) returns

// What an operation works on. The files under the root are put back before every run.
struct Fixture {
    Fixture();

    TempRoot root;
    std::string database; // checked for integrity after every run; "" when the operation has none
    std::list<_SYSLOG_SQL_COND_tag> conditions;
    std::vector<std::string> seen; // what the run delivered
};

// How a run ended.
struct Outcome {
    // What failed first: a platform function's name, "allocation", "write", "full disk", "read"; "" for
    // nothing.
    std::string fault;
    bool outOfMemory = false; // std::bad_alloc came out; `result` means nothing
    int result = 0;
    // The kind of failure that a program can read; KELO_FAILURE_NONE when none was recorded.
    KELOFAILUREKIND kind = KELO_FAILURE_NONE;
    std::vector<std::string> messages; // the system log

    // Whether the operation says that it is done.
    bool IsDone() const { return !outOfMemory && result >= 0; }
    // Whether the values of conditions may have been replaced by "", as a value is that cannot be escaped.
    bool MayHaveLostValues() const { return fault.starts_with("KELODBEscape") || fault == "allocation"; }
};

// One operation of the library for the fault loops. That it ends, leaves nothing open or leaked, creates no
// file and keeps the database sound is checked for every one; a row adds what only it can know.
struct Operation {
    const char *name;
    bool writes; // whether it writes to files, so that writes can fail
    std::function<void(Fixture &)> setUp;
    // Runs the operation; a result below 0 is a failure. What it does for the test is done under a
    // FaultPause.
    std::function<int(Fixture &)> run;
    // Whether what was promised holds, whatever failed.
    std::function<void(const Fixture &, const Outcome &)> check;
    // Whether the same files are there afterwards. One that creates or moves a file checks itself what is
    // there.
    bool keepsFiles = true;

    friend void PrintTo(const Operation &operation, std::ostream *out) { *out << operation.name; }
};

// The operations of the database handler.
std::vector<Operation> HandlerOperations();

// Every operation that the fault loops drive.
const std::vector<Operation> &Operations();

} // namespace kelo::test
