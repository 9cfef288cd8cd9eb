#pragma once

// Common includes of the tests: GoogleTest, the fixtures, and the system's headers that nearly all of them
// need.

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <random>
#include <set>
#include <string>
#include <vector>

#include "keloplatform/root.h"
#include "kelosyslog/root.h"
#include "support/log_database.h"
#include "support/platform_calls.h"
#include "support/source_dir.h"
#include "support/syslog_capture.h"
#include "support/temp_root.h"

namespace kelo::test {

using testing::AllOf, testing::AnyOf, testing::Not, testing::IsEmpty;
using testing::Contains, testing::ElementsAre, testing::Pair;
using testing::HasSubstr, testing::MatchesRegex, testing::StartsWith;

// A root of its own for the library and the platform, and the system log. Checks at the end that nothing of
// the platform is left open.
class LibraryTest : public testing::Test {
protected:
    LibraryTest() {
        SyslogRootSet(root_.Path());
        KELORootSet(root_.Path().c_str());
        PlatformCalls::Start();
    }
    ~LibraryTest() override {
        EXPECT_EQ(PlatformCalls::OpenHandles(), 0);
        SyslogRootSet("");
        KELORootSet("");
    }

    // The system log since the last call, without what the database handler adds about failed statements.
    std::vector<std::string> TakeTexts() {
        std::vector<std::string> texts = log_.TakeTexts();
        std::erase_if(texts, [](const std::string &text) { return text.starts_with("dbhandler:"); });
        return texts;
    }

    TempRoot root_;
    SyslogCapture log_;
};

} // namespace kelo::test
