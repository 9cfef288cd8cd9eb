#include "keepspool/spool_keeper.h"

#include <fcntl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <csignal>
#include <fstream>

#include "support/test.h"

using namespace kelo::test;
using kelo::tool::FileHandle;
using kelo::tool::SpoolKeeper;

namespace {

std::map<ino_t, off_t> synced; // sizes

class Keeper : public testing::Test {
protected:
    Keeper() {
        fs::create_directories(files_);
        fs::create_directories(root_.File("run"));
        Append("1", "12345");
        Append("2", "12345");
    }
    void Append(const std::string &name, const std::string &bytes) const {
        std::ofstream(files_ + name, std::ios::app) << bytes;
    }
    // What the receiver says that it has read of the file.
    void Tell(const std::string &name, int bytes, int otherInode = 0) const {
        struct stat status {};
        stat((files_ + name).c_str(), &status);
        std::ofstream(root_.File("run/spool-done"), std::ios::app)
            << status.st_ino + static_cast<ino_t>(otherInode) << " " << bytes << " " << name << "\n";
    }
    // Two passes, each long after the last change.
    void Pass() {
        for (int times = 0; times < 2; ++times) {
            fs::remove(root_.File("run/spool-done"));
            for (const auto &entry : fs::directory_iterator(files_)) {
                if (isRead_(entry.path().filename()))
                    Tell(entry.path().filename(), 5);
            }
            keeper_.Step(std::time(nullptr) + 100);
        }
    }
    size_t Files() const {
        return static_cast<size_t>(std::distance(fs::directory_iterator(files_), fs::directory_iterator()));
    }

    TempRoot root_;
    const std::string files_ = root_.File("files/");
    SpoolKeeper keeper_{root_.Path(), root_.File("run"), {.bytes = 1000, .spare = 1}};
    std::function<bool(const std::string &)> isRead_ = [](const std::string &name) { return name != "2"; };
};

} // namespace

// In place of the C library's.
extern "C" int fdatasync(int file) {
    struct stat status {};
    if (fstat(file, &status) == 0)
        synced[status.st_ino] = status.st_size;
    return static_cast<int>(syscall(SYS_fdatasync, file));
}

// What bounds the loss at a power cut: each pass syncs what has come since the last one, and nothing else.
TEST_F(Keeper, SyncsWhatHasCome) {
    const auto sizes = [this](const std::string &name) {
        struct stat status {};
        stat((files_ + name).c_str(), &status);
        return std::pair(synced.contains(status.st_ino) ? synced[status.st_ino] : 0, status.st_size);
    };
    const int64_t now = std::time(nullptr);
    keeper_.Step(now);
    EXPECT_EQ(sizes("1"), std::pair(5L, 5L));
    synced.clear();
    Append("2", "more");
    keeper_.Step(now + 1);
    EXPECT_EQ(sizes("1"), std::pair(0L, 5L));
    EXPECT_EQ(sizes("2"), std::pair(9L, 9L));
}

TEST_F(Keeper, RemovesWhatWasReadToItsEndAndIsClosed) {
    {
        const FileHandle writer(open((files_ + "1").c_str(), O_WRONLY));
        Pass();
        EXPECT_EQ(Files(), 2U) << "somebody can write it";
    }
    const FileHandle reader(open((files_ + "1").c_str(), O_RDONLY));
    Tell("1", 5);
    keeper_.Step(std::time(nullptr));
    EXPECT_TRUE(fs::exists(files_ + "1")) << "it has just changed";
    Pass();
    EXPECT_EQ(Files(), 1U);
    EXPECT_TRUE(fs::exists(files_ + "2"));
}

TEST_F(Keeper, KeepsWhatGrowsIsAnotherFileOrElsewhere) {
    Append("1", "6");
    Pass();
    EXPECT_EQ(Files(), 2U);
    fs::create_symlink("../run/precious", files_ + "link");
    WriteFile(root_.File("run/precious"), "");
    Tell("2", 5, 1);
    Tell("../run/precious", 5);
    Tell("link", 5);
    std::ofstream(root_.File("run/spool-done"), std::ios::app) << "x\n1 2\n99999999999999999999 1 2\n";
    for (int times = 0; times < 3; ++times)
        keeper_.Step(std::time(nullptr) + 100);
    EXPECT_EQ(Files(), 3U);
    EXPECT_TRUE(fs::exists(root_.File("run/precious")));
}

TEST_F(Keeper, ClosesTheSpoolWhileItIsFull) {
    const auto step = [this] { return keeper_.Step(std::time(nullptr)); };
    const auto isOpen = [this] { return fs::is_symlink(root_.File("in")); };
    EXPECT_EQ(step(), "");
    EXPECT_TRUE(isOpen());
    Append("2", std::string(1000, 'x'));
    EXPECT_THAT(step(), HasSubstr("is full"));
    EXPECT_FALSE(isOpen());
    EXPECT_EQ(step(), "");
    fs::resize_file(files_ + "2", 800); // it stays closed until a quarter is free
    EXPECT_EQ(step(), "");
    EXPECT_FALSE(isOpen());
    fs::resize_file(files_ + "2", 700);
    EXPECT_THAT(step(), HasSubstr("has room again"));
    EXPECT_TRUE(isOpen());
}
