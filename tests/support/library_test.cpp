#include "keloplatform/root.h"
#include "kelosyslog/root.h"
#include "support/test.h"

namespace kelo::test {

LibraryTest::LibraryTest() {
    SyslogRootSet(root_.Path());
    KELORootSet(root_.Path().c_str());
    PlatformCalls::Reset();
}

LibraryTest::~LibraryTest() {
    EXPECT_EQ(PlatformCalls::OpenConnections(), 0);
    EXPECT_EQ(PlatformCalls::OpenResults(), 0);
    SyslogRootSet("");
    KELORootSet("");
}

void LibraryTest::Write(const std::string &path, const std::string &content) const {
    const fs::path file = root_.Path() + path;
    fs::create_directories(file.parent_path());
    WriteFile(file.string(), content);
}

std::vector<std::string> LibraryTest::Messages() {
    std::vector<std::string> texts = log_.Texts();
    log_.Clear();
    std::erase_if(texts, [](const std::string &text) { return text.starts_with("dbhandler:"); });
    return texts;
}

} // namespace kelo::test
