#pragma once

#include <list>

#include "kelosyslog/dbutil.h"
#include "support/test.h"

namespace kelo::test {

using Conditions = std::list<_SYSLOG_SQL_COND_tag>;

// A log database.
class QueryTest : public LibraryTest {
protected:
    QueryTest() {
        CreateLogDatabase(path_);
        PlatformCalls::Reset();
    }
    // The SQL text of the only statement since the last call of this function.
    static std::string TakeStatement() {
        const std::vector<std::string> statements = PlatformCalls::Texts();
        PlatformCalls::Reset();
        return statements.size() == 1 ? statements[0] : std::to_string(statements.size()) + " statements";
    }

    const std::string path_ = root_.File("logs.db");
};

} // namespace kelo::test
