#include <sys/file.h>

#include "keloplatform/torvc.h"
#include "support/test.h"

namespace kelo::test {
namespace {

constexpr char kFormat[] = "%s=\"%s\"\n";
using Pairs = std::vector<std::pair<std::string, std::string>>;

class SectionFile : public testing::Test {
protected:
    static int Set(const std::string &path, const char *section, const char *newName, const Pairs &pairs,
                   const char *format = kFormat) {
        TORVSZHASH *hash = TORVCSzHashAlloc(1);
        for (const auto &[key, value] : pairs)
            EXPECT_EQ(TORVCSzHashSetValue(&hash, key.c_str(), value.c_str()), 0);
        const int status = TORVCFileSetSection(path.c_str(), section, newName, hash, format);
        TORVCSzHashFree(hash);
        return status;
    }

    // The value of one key of a section; "(none)" where it or the section is missing, "(failed)" on failure.
    std::string Get(const char *section, const char *key) const {
        TORVSZHASH *hash = TORVCSzHashAlloc(4);
        const int status = TORVCFileGetSection(path_.c_str(), section, &hash);
        const char *value = TORVCSzHashGetValue(hash, key);
        const std::string text = value != nullptr                ? value
                                 : status < 0 && errno != ENOENT ? "(failed)"
                                                                 : "(none)";
        TORVCSzHashFree(hash);
        return text;
    }

    std::vector<std::string> Names(int expectedStatus = 0) const {
        TORVSZLIST *list = TORVCSzListAlloc(1);
        EXPECT_EQ(TORVCFileEnumSection(path_.c_str(), &list), expectedStatus);
        std::vector<std::string> names(list->items, list->items + list->count);
        TORVCSzListFree(list);
        return names;
    }

    TempRoot root_;
    SyslogCapture log_;
    const std::string path_ = root_.File("notify.conf");
};

TEST_F(SectionFile, RefusesWhatItCouldNotGiveBackAndStaysAsItIs) {
    const std::string content = "[R1]\nkey=\"1\"\n[R2]\nkey=\"2\"\n";
    WriteFile(path_, content);
    const std::tuple<const char *, const char *, const char *, const char *, const char *> cases[] = {
        {"R1", "key", "two\nlines", kFormat, "value of key"},
        {"R1", "#key", "1", kFormat, "value of #key"},
        {"R1", "key", " blank", "%s=%s\n", "value of key"},
        {"R1", "key", "1", "%s=%s%n\n", "line format"},
        {"R1", "key", "1", "%s=%s", "line format"},
        {"R[1]", "key", "1", kFormat, "\"R[1]\""},
        {"", "key", "1", kFormat, "not a section name"},
        {"R2", "key", "1", kFormat, "there is a section R2"},
    };
    for (const auto &[newName, key, value, format, message] : cases) {
        EXPECT_EQ(Set(path_, "R1", newName, {{key, value}}, format), -1) << message;
        EXPECT_THAT(log_.TakeTexts(), ElementsAre(AllOf(StartsWith(path_ + ": "), HasSubstr(message))));
    }
    EXPECT_EQ(ReadFile(path_), content);
}

TEST_F(SectionFile, ChangesNothingButTheSection) {
    const std::string head = "\xEF\xBB\xBF# rules\r\nloose = 1\r\n\r\n";
    const std::string broken = "[bad\nx=1\n[R1]\nkey=\"late\"";
    const std::string tail = "; about R2\n  [R2] # second\nkey=\"2\"\nno entry\n" + broken;
    const std::string before = head + "[R1]\n# why\nkey = 'old'\ngone=\"1\"\nkey=\"twice\"\n\n" + tail;
    const std::tuple<const char *, const char *, Pairs, std::string> cases[] = {
        {"R1", "R1", {{"new", "n"}, {"key", "k"}}, head + "[R1]\n# why\nkey=\"k\"\nnew=\"n\"\n\n" + tail},
        {"R1", "R9", {{"key", "k"}}, head + "[R9]\n# why\nkey=\"k\"\n\n" + tail},
        {"R2", "R4", {}, before.substr(0, before.find("[R2]")) + "[R4] # second\n" + broken},
        {"R3", "R3", {{"key", "k"}}, before + "\n\n[R3]\nkey=\"k\"\n"},
        {"R1", nullptr, {}, head + "\n" + tail},
    };
    for (const auto &[section, newName, pairs, after] : cases) {
        WriteFile(path_, before);
        EXPECT_EQ(Set(path_, section, newName, pairs), 0);
        EXPECT_EQ(ReadFile(path_), after);
    }
}

TEST_F(SectionFile, ReadsWhatPeopleWrite) {
    WriteFile(path_, "\xEF\xBB\xBF[R1]\r\n a =  plain text # all of it\r\n\tb=\"x\" \r\nc=\na=\"second\"\n"
                     "[R1] ; again\na=\"third\"\n[ R2 ]\nopen=\"1\nfine=1\n[]\na=1\n[R3");
    EXPECT_THAT(Names(), ElementsAre("R1", " R2 "));
    EXPECT_THAT(log_.TakeTexts(), ElementsAre(HasSubstr(path_ + ":11: not a section header")));
    EXPECT_EQ(Get("R1", "a"), "plain text # all of it");
    EXPECT_EQ(Get("R1", "b"), "x");
    EXPECT_EQ(Get("R9", "a"), "(none)");
    log_.Take();
    EXPECT_EQ(Get(" R2 ", "fine"), "(failed)");
    EXPECT_THAT(log_.TakeTexts(), ElementsAre(HasSubstr(path_ + ":9: ")));
}

TEST_F(SectionFile, AnswersForEveryKindOfFile) {
    EXPECT_THAT(Names(-1), IsEmpty());
    EXPECT_EQ(errno, ENOENT);
    EXPECT_EQ(Set(root_.Path(), "R", "R", {}), -1);
    EXPECT_EQ(errno, EISDIR);
    ASSERT_EQ(mkfifo(path_.c_str(), 0600), 0);
    Names(-1);
    EXPECT_EQ(Set(path_, "R", "R", {}), -1);
    fs::remove(path_);
    const std::string content = std::string("\xFF[\0=\n\x01", 6) + "\n";
    WriteFile(path_, content);
    EXPECT_EQ(Set(path_, "R1", "R1", {{"key", "1"}}), 0);
    EXPECT_EQ(Get("R1", "key"), "1");
    EXPECT_THAT(ReadFile(path_), StartsWith(content));
}

TEST_F(SectionFile, SeesEveryChangeInPlace) {
    for (int i = 10000; i < 10200; ++i) {
        WriteFile(path_, "[R]\nkey=\"" + std::to_string(i) + "\"\n");
        ASSERT_EQ(Get("R", "key"), std::to_string(i));
    }
}

TEST_F(SectionFile, KeepsModeOwnerAndLinksWhenItIsReplaced) {
    const std::string real = root_.File("real/notify.conf"), temporary = root_.File("real/.notify.conf.new");
    WriteFile(real, "[R]\n");
    WriteFile(temporary, "left by a writer that was killed");
    struct stat before, after;
    ASSERT_EQ(chmod(real.c_str(), 0640), 0);
    ASSERT_TRUE(geteuid() != 0 || chown(real.c_str(), 12345, 23456) == 0);
    ASSERT_EQ(lstat(real.c_str(), &before), 0);
    fs::create_symlink("real/notify.conf", path_);
    ASSERT_EQ(Set(path_, "R", "R", {{"key", "1"}}), 0);
    ASSERT_EQ(lstat(real.c_str(), &after), 0);
    EXPECT_EQ(std::tie(after.st_mode, after.st_uid, after.st_gid),
              std::tie(before.st_mode, before.st_uid, before.st_gid));
    EXPECT_EQ(Get("R", "key"), "1");
    EXPECT_TRUE(fs::is_symlink(path_) && !fs::exists(temporary));

    fs::remove(real);
    log_.Take();
    EXPECT_EQ(Set(path_, "R", "R", {{"key", "1"}}), -1);
    EXPECT_THAT(log_.TakeTexts(), ElementsAre(HasSubstr("symbolic link to nothing")));
}

TEST_F(SectionFile, LosesNothingToTwoWritersOfDifferentSections) {
    // Whoever may only read the folder cannot make a writer wait.
    const int reader = open(root_.Path().c_str(), O_RDONLY | O_CLOEXEC);
    EXPECT_EQ(flock(reader, LOCK_EX), 0);
    const auto write = [&](const std::string &writer) { // creates the file
        int failures = 0;
        for (int i = 0; i < 50; ++i) {
            const std::string name = writer + std::to_string(i);
            failures += Set(path_, name.c_str(), name.c_str(), {{"key", name}}) != 0;
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
    EXPECT_THAT(Names(), testing::SizeIs(100));
    close(reader);
    struct stat lock {};
    ASSERT_EQ(stat(root_.File(".notify.conf.lock").c_str(), &lock), 0);
    EXPECT_EQ(lock.st_mode & 0444, 0U) << "nor take the lock itself";
}

TEST_F(SectionFile, GivesTheFirstValueOfAKeyAndTellsWhenItIsCut) {
    WriteFile(path_, "# smtp=\"no\"\nsmtp=\"yes\"\nsmtp=\"no\"\nopen=\"x\n[mail]\nlong=\"0123456789\"\n");
    for (const auto &[key, result, text] :
         {std::tuple("smtp", 3, "yes"), {"long", 10, "012"}, {"none", -1, ""}, {"open", -1, ""}}) {
        char buffer[5] = {'#', '#', '#', '#', '#'};
        EXPECT_EQ(TORVCFileGetKeyValue(path_.c_str(), key, buffer, 4, 0), result) << key;
        EXPECT_STREQ(buffer, text);
        EXPECT_EQ(buffer[4], '#');
    }
}

} // namespace
} // namespace kelo::test
