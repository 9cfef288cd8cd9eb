#include "support/program_test.h"

namespace kelo::test {

std::string LogLines(int first, int count) {
    std::string text;
    for (int number = first; number < first + count; ++number)
        text += kLogHead + "message " + std::to_string(number) + "\n";
    return text;
}

ProgramTest::ProgramTest() {
    for (const char *folder : {"usr/kelo/syslog", "usr/kelo/etc", "var/log/kelolog", "etc/kelosyslog",
                               "var/spool/kelonotify/new", "var/spool/kelonotify/failed"})
        fs::create_directories(root_.File(folder));
    fs::create_symlink(BuildPath("package/schema"), root_.File("usr/kelo/syslog/schema"));
}

void ProgramTest::Expect(const std::string &words, int status, const std::optional<std::string> &out) const {
    const ProgramResult result = Run(words);
    EXPECT_EQ(result.status, status) << words << "\n" << result.err;
    EXPECT_EQ(result.out, out.value_or(result.out)) << words << "\n" << result.err;
}

} // namespace kelo::test
