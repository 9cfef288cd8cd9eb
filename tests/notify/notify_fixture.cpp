#include "notify/notify_fixture.h"

#include <filesystem>

#include "keloplatform/root.h"
#include "kelosyslog/root.h"

namespace kelo::test {

NotifyTest::NotifyTest() {
    SyslogRootSet(root_.Path());
    KELORootSet(root_.Path().c_str());
    PlatformCalls::Reset();
    NotifyCalls::Reset();
}

NotifyTest::~NotifyTest() {
    EXPECT_EQ(NotifyCalls::OpenHandles(), 0);
    SyslogRootSet("");
    KELORootSet("");
}

void NotifyTest::Write(const std::string &path, const std::string &content) {
    const std::filesystem::path file = root_.Path() + path;
    std::filesystem::create_directories(file.parent_path());
    WriteFile(file.string(), content);
}

SentNotification NotifyTest::Sent(const std::string &tag, std::map<std::string, std::string> values) const {
    return {tag, root_.Path() + "/usr/kelo/keloman/webman/modules/Quillbay/texts/",
            root_.Path() + "/etc/kelosyslog/notify.filter", std::move(values)};
}

std::vector<std::string> NotifyTest::Messages() {
    const std::vector<std::string> texts = log_.Texts();
    log_.Clear();
    return texts;
}

std::string RuleText(const std::string &name, int type, const std::string &pri, const std::string &eps,
                     const std::string &pattern, const std::string &enable) {
    return "[" + name + "]\nnotify_type=\"" + std::to_string(type) + "\"\nnotify_pri=\"" + pri +
           "\"\nnotify_eps=\"" + eps + "\"\nnotify_pat=\"" + pattern + "\"\nnotify_enable=\"" + enable +
           "\"\n";
}

} // namespace kelo::test
