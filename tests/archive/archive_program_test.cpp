// kelosyslog archive as a user runs it.

#include "support/program_test.h"

namespace kelo::test {
namespace {

class ArchiveProgram : public ProgramTest {
protected:
    ArchiveProgram() {
        CreateLogDatabase(logs_);
        InsertSampleLogs(logs_, 500);
    }
    std::string Left() const {
        return RunSql(logs_, "SELECT count(*) || ' ' || sum(host = 'host07') FROM logs");
    }

    const std::string name_ = "host07_2020-01-01_2020-01-01";
};

TEST_F(ArchiveProgram, ArchivesListsSearchesAndPrunes) {
    Expect("archive --remove-archived --dry-run", 0);
    EXPECT_FALSE(fs::exists(archives_));
    Expect("archive --device host07 --remove-archived --yes", 0);
    EXPECT_EQ(Left(), "490 0");
    Expect("archive", 0);
    Expect("archive --device none", 1);
    EXPECT_EQ(RunSql(events_, "SELECT group_concat(substr(event, length(event) - 8), ',') FROM log"),
              " archive.,archived., archive.,archived.")
        << "without logs there is no event";

    Expect("count --log " + name_, 0, "10\n");
    Expect("search --log " + name_ + ".db -n 1 --fields id -o csv", 0, "id\r\n458\r\n");
    EXPECT_THAT(Run("archive --list -o csv").out,
                HasSubstr(name_ + ".db,host07,2020-01-01T00:00:07+00:00,2020-01-01T00:07:37+00:00,10,"));
    Expect("archive --prune --keep-size 1 --yes", 0);
    Expect("archive --list", 1);
}

TEST_F(ArchiveProgram, RemovesWhatAnEarlierRunLeft) {
    Expect("archive --device host07", 0);
    WriteFile(archives_ + "/.removing-" + name_ + ".db", logs_);
    Expect("archive --remove-archived --yes --device host07", 0);
    EXPECT_EQ(Left(), "490 0");
    EXPECT_FALSE(fs::exists(archives_ + "/.removing-" + name_ + ".db"));
}

} // namespace
} // namespace kelo::test
