// The shell completion and the manual page know what the program knows.

#include <re2/re2.h>

#include "program_run.h"
#include "support/source_dir.h"
#include "support/test.h"

namespace kelo::test {
namespace {

using Words = std::set<std::string>;

const std::string kCompletion = SourcePath("package/completion/kelosyslog");

// What the one group of `pattern` finds, anywhere in the text; '^' and '$' are line ends.
Words Matches(const std::string &text, const std::string &pattern) {
    const RE2 regex("(?m)" + pattern);
    re2::StringPiece rest(text);
    Words words;
    for (std::string word; RE2::FindAndConsume(&rest, regex, &word);)
        words.insert(word);
    return words;
}

// What bash offers for the last of `words`, which are to be quoted for the shell.
Words Complete(const std::string &words) {
    const std::string command = "bash -c \". " + kCompletion + "; COMP_WORDS=(kelosyslog " + words +
                                "); COMP_CWORD=\\$((\\${#COMP_WORDS[@]} - 1)); _kelosyslog; "
                                "printf '%s\\n' \\\"\\${COMPREPLY[@]}\\\"\"";
    const TempRoot root;
    EXPECT_EQ(std::system((command + " >" + root.File("offered")).c_str()), 0);
    return Matches(ReadFile(root.File("offered")), "^(.+)$");
}

std::string InRoff(std::string text) {
    RE2::GlobalReplace(&text, "-", "\\\\-");
    return text;
}

// The commands that a help text lists; what it is the help of stands before each.
Words CommandsOf(const std::vector<std::string> &parent) {
    std::vector<std::string> arguments = parent;
    arguments.push_back("--help");
    const std::string help = RunTool(arguments).out;
    return Matches(help.substr(help.find("Subcommands:")), "^  ([a-z-]+)  ");
}

TEST(Documentation, KnowsEveryCommandAndOption) {
    const std::string manual = ReadFile(SourcePath("package/man/kelosyslog.1"));
    const Words commands = CommandsOf({});
    ASSERT_GE(commands.size(), 4U);
    Words offered = commands;
    offered.insert({"--root", "--version", "--help"});
    EXPECT_EQ(Complete("''"), offered);
    EXPECT_EQ(Complete("db ''"), CommandsOf({"db"}));
    std::vector<std::vector<std::string>> lines;
    for (const std::string &command : commands)
        lines.push_back({command});
    for (const std::string &command : CommandsOf({"db"}))
        lines.push_back({"db", command});
    for (std::vector<std::string> arguments : lines) {
        std::string line;
        for (const std::string &word : arguments)
            line += (line.empty() ? "" : " ") + word;
        arguments.push_back("--help");
        Words options = Matches(RunTool(arguments).out, "^  (?:-[A-Za-z],)?(--[a-z-]+)");
        options.insert("--root");
        EXPECT_EQ(Complete(line + " --"), options) << line;
        EXPECT_NE(manual.find(".B kelosyslog " + InRoff(line)), std::string::npos) << line;
        for (const std::string &option : options)
            EXPECT_TRUE(option == "--help" || manual.find(InRoff(option)) != std::string::npos) << option;
    }
}

TEST(Completion, OffersTheValuesOfAnOptionAndListsWithExclusions) {
    EXPECT_EQ(Complete("search -p e"), (Words{"emerg", "err"}));
    EXPECT_EQ(Complete("count --priority = err,\\!e"), (Words{"err,!emerg", "err,!err"}));
    EXPECT_EQ(Complete("search --facility local0,local7,ke"), (Words{"local0,local7,kern"}));
    EXPECT_EQ(Complete("search --output = js"), (Words{"json", "jsonl"}));
    EXPECT_EQ(Complete("values -o s"), Words{});
    EXPECT_EQ(Complete("db info -o ''"), (Words{"text", "json"}));
    EXPECT_EQ(Complete("values ut"), (Words{"utcsec"}));
    const TempRoot root;
    std::filesystem::create_directories(root.File("var/log/kelolog/archive/nas_2020.db"));
    EXPECT_EQ(Complete("count --root " + root.Path() + " --log n"), (Words{"nas_2020"}));
}

} // namespace
} // namespace kelo::test
