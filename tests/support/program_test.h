#pragma once

#include "support/child_program.h"
#include "support/test.h"

namespace kelo::test {

// The fields of a log in front of its message, and lines of logs "message FIRST", ...
const std::string kLogHead = "local0 info 2020/01/02 10:11:12 100 200 +08:00 nas 127.0.0.1 prog tag ";

inline std::string LogLines(int first, int count) {
    std::string text;
    for (int number = first; number < first + count; ++number)
        text += kLogHead + "message " + std::to_string(number) + "\n";
    return text;
}

// A root with the server's folders and schemas in it, for programs that run there.
class ProgramTest : public testing::Test {
protected:
    ProgramTest() {
        for (const char *folder :
             {"usr/kelo/syslog", "usr/kelo/etc", "var/log/kelosyslog", "var/log/kelolog", "etc/kelosyslog",
              "var/spool/kelonotify/new", "var/spool/kelonotify/failed"})
            fs::create_directories(root_.File(folder));
        fs::create_symlink(BuildPath("package/schema"), root_.File("usr/kelo/syslog/schema"));
    }

    // Runs "kelosyslog WORDS" in the root. A shell reads the words.
    ProgramResult Run(const std::string &words) const { return RunIn(root_.Path(), kProgram + words); }
    // The same, and checks what is expected of it.
    void Expect(const std::string &words, int status, const std::optional<std::string> &out = {}) const {
        const ProgramResult result = Run(words);
        EXPECT_EQ(result.status, status) << words << "\n" << result.err;
        EXPECT_EQ(result.out, out.value_or(result.out)) << words << "\n" << result.err;
    }

    static constexpr char kProgram[] = "exec kelosyslog --root . ";
    TempRoot root_;
    const std::string logs_ = root_.File("var/log/kelosyslog/logs.db");
    const std::string archives_ = root_.File("var/log/kelosyslog/archive");
    const std::string accounting_ = root_.File("var/log/kelolog/.KELOACCOUNTDB");
    const std::string events_ = root_.File("usr/kelo/etc/kelosyslog.db");
    const std::string rules_ = root_.File("etc/kelosyslog/notify.conf");
    const std::string spool_ = root_.File("var/spool/kelonotify/");
};

} // namespace kelo::test
