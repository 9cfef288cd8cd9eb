#include "keloplatform/root.h"
#include "kelosyslog/root.h"
#include "support/test.h"

namespace kelo::test {

LibraryTest::LibraryTest() {
    SyslogRootSet(root_.Path());
    KELORootSet(root_.Path().c_str());
    PlatformCalls::Start();
}

LibraryTest::~LibraryTest() {
    EXPECT_EQ(PlatformCalls::OpenHandles(), 0);
    SyslogRootSet("");
    KELORootSet("");
}

std::vector<std::string> LibraryTest::TakeTexts() {
    std::vector<std::string> texts = log_.TakeTexts();
    std::erase_if(texts, [](const std::string &text) { return text.starts_with("dbhandler:"); });
    return texts;
}

} // namespace kelo::test
