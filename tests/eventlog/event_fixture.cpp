#include "eventlog/event_fixture.h"

#include <filesystem>

#include "kelosyslog/root.h"

namespace kelo::test {
namespace {

namespace fs = std::filesystem;

const std::string kSchema = KELO_SOURCE_DIR "/package/schema/kelosyslog.sql";

} // namespace

EventTest::EventTest() {
    SyslogRootSet(root_.Path());
    fs::create_directories(root_.File("usr/kelo/syslog/schema"));
    fs::copy_file(kSchema, root_.File("usr/kelo/syslog/schema/kelosyslog.sql"));
    PlatformCalls::Reset();
}

EventTest::~EventTest() {
    PlatformCalls::Reset();
    EXPECT_EQ(PlatformCalls::OpenConnections(), 0);
    EXPECT_EQ(PlatformCalls::OpenResults(), 0);
    SyslogRootSet("");
}

void EventTest::CreateEvents(int rows) const {
    fs::create_directories(fs::path(db_).parent_path());
    RunSql(db_, "PRAGMA journal_mode=WAL; PRAGMA synchronous=OFF;" + ReadFile(kSchema) +
                    "WITH n(i) AS (SELECT 0 UNION ALL SELECT i + 1 FROM n WHERE i + 1 < " +
                    std::to_string(rows) +
                    ") INSERT INTO log SELECT NULL, 0, 1000 + i, 'SYSTEM', 'event ' || i FROM n");
}

Lines EventTest::Messages() {
    Lines texts = log_.Texts();
    log_.Clear();
    std::erase_if(texts, [](const std::string &text) { return text.starts_with("dbhandler:"); });
    return texts;
}

} // namespace kelo::test
