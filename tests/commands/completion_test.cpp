// The script that completes command lines in bash, with the tables that were made for it.

#include <sstream>

#include "support/program_test.h"

namespace kelo::test {
namespace {

using Words = std::set<std::string>;

// What bash offers for the last of `words`, which are to be quoted for the shell.
Words Complete(const std::string &words) {
    const ProgramResult result =
        RunIn(BuildPath("package"), "bash -c \". completion/kelosyslog; COMP_WORDS=(kelosyslog " + words +
                                        "); COMP_CWORD=\\$((\\${#COMP_WORDS[@]} - 1)); _kelosyslog; "
                                        "printf '%s\\n' \\\"\\${COMPREPLY[@]}\\\"\"");
    EXPECT_EQ(result.status, 0) << result.err;
    Words offered;
    std::istringstream lines(result.out);
    for (std::string line; std::getline(lines, line);)
        offered.insert(line);
    offered.erase("");
    return offered;
}

TEST(Completion, OffersWhatGoesWithTheCommandLine) {
    const TempRoot root;
    fs::create_directories(root.File("var/log/kelosyslog/archive/nas_2020.db"));
    const std::pair<std::string, Words> cases[] = {
        {"re", {"report", "receive", "retention"}},
        {"--root / db r", {"reopen"}}, // behind an option with its value
        {"db create --", {"--output", "--db", "--schema", "--root", "--errors", "--help"}},
        {"events clear-log --", {"--user", "--yes", "--root", "--errors", "--help"}},
        {"events count --prio", {"--priority"}}, // of the command above
        {"events count --priority w", {"warning"}},
        {"search -p e", {"emerg", "err"}},
        {"count --priority = err,\\!e", {"err,!emerg", "err,!err"}},
        {"search --facility local0,local7,ke", {"local0,local7,kern"}},
        {"search --output = js", {"json", "jsonl"}},
        {"values -o sh", {}},
        {"values ut", {"utcsec"}},
        {"values host ''", {}},
        {"notify test d", {"desktop"}},
        {"notify retry ''", {}},
        {"count --root " + root.Path() + " --log n", {"nas_2020"}},
        {"report " + root.Path() + "/v", {root.File("var")}},
    };
    for (const auto &[words, offered] : cases)
        EXPECT_EQ(Complete(words), offered) << words;
}

} // namespace
} // namespace kelo::test
