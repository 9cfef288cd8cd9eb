#include "keloplatform/torvc.h"
#include "support/test.h"

using namespace kelo::test;

namespace {

constexpr char kFormat[] = "%s=\"%s\"\n";
using Pairs = std::vector<std::pair<std::string, std::string>>;

int Set(const std::string &path, const char *section, const char *newName, const Pairs &pairs,
        const char *format = kFormat) {
    TORVSZHASH *hash = TORVCSzHashAlloc(1);
    for (const auto &[key, value] : pairs)
        EXPECT_EQ(TORVCSzHashSetValue(&hash, key.c_str(), value.c_str()), 0);
    const int status = TORVCFileSetSection(path.c_str(), section, newName, hash, format);
    TORVCSzHashFree(hash);
    return status;
}

// The value of one key of a section; "(none)" where it or the section is missing, "(failed)" on failure.
std::string Get(const std::string &path, const char *section, const char *key) {
    TORVSZHASH *hash = TORVCSzHashAlloc(4);
    const int status = TORVCFileGetSection(path.c_str(), section, &hash);
    const char *value = TORVCSzHashGetValue(hash, key);
    const std::string text = value != nullptr ? value : status < 0 && errno != ENOENT ? "(failed)" : "(none)";
    TORVCSzHashFree(hash);
    return text;
}

std::vector<std::string> Names(const std::string &path, int expectedStatus = 0) {
    TORVSZLIST *list = TORVCSzListAlloc(1);
    EXPECT_EQ(TORVCFileEnumSection(path.c_str(), &list), expectedStatus);
    std::vector<std::string> names(list->items, list->items + list->count);
    TORVCSzListFree(list);
    return names;
}

} // namespace

TEST(SectionFile, RefusesWhatItCouldNotGiveBackAndStaysAsItIs) {
    const TempRoot root;
    const std::string path = root.File("notify.conf");
    const std::string content = "[R1]\nkey=\"1\"\n[R2]\nkey=\"2\"\n";
    WriteFile(path, content);
    const struct {
        const char *section, *newName, *key, *value, *format, *message;
    } cases[] = {
        {"R1", "R1", "key", "two\nlines", kFormat, "value of key"},
        {"R1", "R1", "#key", "1", kFormat, "value of #key"},
        {"R1", "R1", "key", " blank", "%s=%s\n", "value of key"},
        {"R1", "R1", "key", "1", "%s=%s%n\n", "line format"},
        {"R1", "R1", "key", "1", "%s=%s", "line format"},
        {"R1", "R[1]", "key", "1", kFormat, "\"R[1]\""},
        {"R1", "", "key", "1", kFormat, "not a section name"},
        {"R1", "R2", "key", "1", kFormat, "there is a section R2"},
    };
    for (const auto &c : cases) {
        SyslogCapture log;
        EXPECT_EQ(Set(path, c.section, c.newName, {{c.key, c.value}}, c.format), -1) << c.message;
        EXPECT_THAT(log.TakeTexts(), ElementsAre(AllOf(StartsWith(path + ": "), HasSubstr(c.message))));
    }
    EXPECT_EQ(ReadFile(path), content);
}

TEST(SectionFile, ChangesNothingButTheSection) {
    const TempRoot root;
    const std::string path = root.File("notify.conf");
    const std::string head = "\xEF\xBB\xBF# rules\r\nloose = 1\r\n\r\n";
    const std::string broken = "[bad\nx=1\n[R1]\nkey=\"late\"";
    const std::string tail = "; about R2\n  [R2] # second\nkey=\"2\"\nno entry\n" + broken;
    const std::string before = head + "[R1]\n# why\nkey = 'old'\ngone=\"1\"\nkey=\"twice\"\n\n" + tail;
    const struct {
        const char *section, *newName;
        Pairs pairs;
        std::string after;
    } cases[] = {
        {"R1", "R1", {{"new", "n"}, {"key", "k"}}, head + "[R1]\n# why\nkey=\"k\"\nnew=\"n\"\n\n" + tail},
        {"R1", "R9", {{"key", "k"}}, head + "[R9]\n# why\nkey=\"k\"\n\n" + tail},
        {"R2", "R4", {}, before.substr(0, before.find("[R2]")) + "[R4] # second\n" + broken},
        {"R3", "R3", {{"key", "k"}}, before + "\n\n[R3]\nkey=\"k\"\n"},
        {"R1", nullptr, {}, head + "\n" + tail},
    };
    for (const auto &c : cases) {
        WriteFile(path, before);
        EXPECT_EQ(Set(path, c.section, c.newName, c.pairs), 0);
        EXPECT_EQ(ReadFile(path), c.after);
    }
}

TEST(SectionFile, ReadsWhatPeopleWrite) {
    const TempRoot root;
    const std::string path = root.File("notify.conf");
    WriteFile(path, "\xEF\xBB\xBF[R1]\r\n a =  plain text # all of it\r\n\tb=\"x\" \r\nc=\na=\"second\"\n"
                    "[R1] ; again\na=\"third\"\n[ R2 ]\nopen=\"1\nfine=1\n[]\na=1\n[R3");
    SyslogCapture log;
    EXPECT_THAT(Names(path), ElementsAre("R1", " R2 "));
    EXPECT_THAT(log.TakeTexts(), ElementsAre(HasSubstr(path + ":11: not a section header")));
    EXPECT_EQ(Get(path, "R1", "a"), "plain text # all of it");
    EXPECT_EQ(Get(path, "R1", "b"), "x");
    EXPECT_EQ(Get(path, "R9", "a"), "(none)");
    EXPECT_EQ(Get(path, " R2 ", "fine"), "(failed)");
    EXPECT_THAT(log.TakeTexts(), ElementsAre(HasSubstr(path + ":9: ")));
}

TEST(SectionFile, AnswersForEveryKindOfFile) {
    const TempRoot root;
    const std::string path = root.File("file");
    EXPECT_THAT(Names(path, -1), ElementsAre());
    EXPECT_EQ(errno, ENOENT);
    EXPECT_EQ(Set(root.Path(), "R", "R", {}), -1);
    EXPECT_EQ(errno, EISDIR);
    ASSERT_EQ(mkfifo(path.c_str(), 0600), 0);
    Names(path, -1);
    EXPECT_EQ(Set(path, "R", "R", {}), -1);
    std::filesystem::remove(path);
    const std::string content = std::string("\xFF[\0=\n\x01", 6) + "\n";
    WriteFile(path, content);
    EXPECT_EQ(Set(path, "R1", "R1", {{"key", "1"}}), 0);
    EXPECT_EQ(Get(path, "R1", "key"), "1");
    EXPECT_TRUE(ReadFile(path).starts_with(content));
}

TEST(SectionFile, SeesEveryChangeInPlace) {
    const TempRoot root;
    const std::string path = root.File("notify.conf");
    for (int i = 0; i < 200; ++i) {
        WriteFile(path, "[R]\nkey=\"" + std::to_string(10000 + i) + "\"\n");
        ASSERT_EQ(Get(path, "R", "key"), std::to_string(10000 + i));
    }
}

TEST(SectionFile, KeepsModeOwnerAndLinksWhenItIsReplaced) {
    const TempRoot root;
    std::filesystem::create_directory(root.File("real"));
    const std::string real = root.File("real/notify.conf");
    const std::string link = root.File("notify.conf");
    WriteFile(real, "[R]\n");
    WriteFile(root.File("real/.notify.conf.new"), "left by a writer that was killed");
    struct stat before, after;
    ASSERT_EQ(chmod(real.c_str(), 0640), 0);
    ASSERT_TRUE(geteuid() != 0 || chown(real.c_str(), 12345, 23456) == 0);
    ASSERT_EQ(lstat(real.c_str(), &before), 0);
    std::filesystem::create_symlink("real/notify.conf", link);
    ASSERT_EQ(Set(link, "R", "R", {{"key", "1"}}), 0);
    ASSERT_EQ(lstat(real.c_str(), &after), 0);
    EXPECT_EQ(after.st_mode, before.st_mode);
    EXPECT_EQ(after.st_uid, before.st_uid);
    EXPECT_EQ(after.st_gid, before.st_gid);
    EXPECT_EQ(Get(real, "R", "key"), "1");
    EXPECT_TRUE(std::filesystem::is_symlink(link));
    EXPECT_FALSE(std::filesystem::exists(root.File("real/.notify.conf.new")));

    std::filesystem::remove(real);
    SyslogCapture log;
    EXPECT_EQ(Set(link, "R", "R", {{"key", "1"}}), -1);
    EXPECT_THAT(log.TakeTexts(), ElementsAre(HasSubstr("symbolic link to nothing")));
}

TEST(SectionFile, TwoWritersOfDifferentSectionsLoseNothing) {
    const TempRoot root;
    const std::string path = root.File("notify.conf"); // does not exist at the start
    const auto write = [&](const std::string &writer) {
        int failures = 0;
        for (int i = 0; i < 50; ++i) {
            const std::string name = writer + std::to_string(i);
            failures += Set(path, name.c_str(), name.c_str(), {{"key", name}}) != 0;
        }
        return failures;
    };
    const pid_t child = fork();
    if (child == 0)
        _exit(write("child"));
    EXPECT_EQ(write("parent"), 0);
    int status = -1;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(Names(path).size(), 100U);
}

TEST(KeyValueFile, GivesTheFirstValueAndTellsWhenItIsCut) {
    const TempRoot root;
    const std::string path = root.File("keloinfo.conf");
    WriteFile(path, "# smtp=\"no\"\nsmtp=\"yes\"\nsmtp=\"no\"\nopen=\"x\n[mail]\nlong=\"0123456789\"\n");
    const struct {
        const char *key;
        int result;
        const char *text;
    } cases[] = {{"smtp", 3, "yes"}, {"long", 10, "012"}, {"none", -1, ""}, {"open", -1, ""}};
    for (const auto &c : cases) {
        char buffer[5] = {'#', '#', '#', '#', '#'};
        EXPECT_EQ(TORVCFileGetKeyValue(path.c_str(), c.key, buffer, 4, 0), c.result) << c.key;
        EXPECT_STREQ(buffer, c.text);
        EXPECT_EQ(buffer[4], '#');
    }
}
