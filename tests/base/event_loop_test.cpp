#include "base/event_loop.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <csignal>
#include <stdexcept>

#include "base/files.h"
#include "support/source_dir.h"

namespace kelo::test {
namespace {

using namespace kelo::tool;

class EventLoopTest : public testing::Test {
protected:
    EventLoopTest() {
        int ends[2];
        EXPECT_EQ(pipe2(ends, O_CLOEXEC), 0);
        out_ = FileHandle(ends[0]);
        in_ = FileHandle(ends[1]);
    }
    EventLoop loop_;
    FileHandle out_;
    FileHandle in_;
    FileHandle null_{open("/dev/null", O_RDWR | O_CLOEXEC)};
    FileHandle regular_{open(kelo::test::SourcePath("CMakeLists.txt").c_str(), O_RDONLY | O_CLOEXEC)};
    int count_ = 0;
};

TEST_F(EventLoopTest, ReadsEveryKindOfFileOnlyWhileEnabled) {
    EXPECT_EQ(write(in_.Get(), "x", 1), 1);
    for (const int file : {out_.Get(), regular_.Get(), null_.Get()}) {
        count_ = 0;
        EventSource input = loop_.AddInput(file, [&] { ++count_; });
        EXPECT_TRUE(loop_.Poll() && loop_.Poll());
        EXPECT_EQ(count_, 2) << "what is not read stays ready";
        input.SetEnabled(false);
        EXPECT_FALSE(loop_.Poll());
        input.SetEnabled(true);
        EXPECT_TRUE(loop_.Poll());
    }
}

TEST_F(EventLoopTest, TellsOfAHangUpWhereThereIsAnotherEnd) {
    const EventSource endless = loop_.AddHangUp(null_.Get(), [] { FAIL(); });
    const EventSource output = loop_.AddHangUp(in_.Get(), [&] { ++count_; });
    EXPECT_FALSE(loop_.Poll());
    out_ = FileHandle();
    EXPECT_TRUE(loop_.Poll());
    EXPECT_EQ(count_, 1);
}

TEST_F(EventLoopTest, ThrowsWhatAHandlerThrowsAndGoesOn) {
    EventSource timer = loop_.AddTimer([&] {
        if (++count_ == 1)
            throw std::runtime_error("first");
    });
    EXPECT_FALSE(loop_.Poll()) << "no time is set";
    timer.FireAt({});
    EXPECT_THROW(loop_.Wait(), std::runtime_error);
    EXPECT_FALSE(loop_.Poll()) << "fires once";
    timer.FireAt({});
    EXPECT_TRUE(loop_.Poll());
}

// A second signal must not strike when the first one has ended the work.
TEST_F(EventLoopTest, TakesSignalsFirstAndDiscardsWhatIsLeft) {
    EXPECT_EQ(write(in_.Get(), "x", 1), 1);
    const EventSource input = loop_.AddInput(out_.Get(), [] { FAIL() << "while a signal waits"; });
    {
        const EventSource term = loop_.AddSignal(SIGTERM, [&] { ++count_; });
        std::raise(SIGTERM);
        loop_.Wait();
        EXPECT_EQ(count_, 1);
        std::raise(SIGTERM);
    }
    sigset_t blocked;
    sigprocmask(SIG_BLOCK, nullptr, &blocked);
    EXPECT_EQ(sigismember(&blocked, SIGTERM), 0);
}

} // namespace
} // namespace kelo::test
