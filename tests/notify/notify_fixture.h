#pragma once

#include "kelosyslog/notification.h"
#include "support/notify_calls.h"
#include "support/test.h"

namespace kelo::test {

// Captures notifications, and checks at the end that no map is left.
class NotifyTest : public LibraryTest {
protected:
    NotifyTest() { NotifyCalls::Reset(); }
    ~NotifyTest() override { EXPECT_EQ(NotifyCalls::OpenHandles(), 0); }

    std::string RulePath() const { return root_.File("etc/kelosyslog/notify.conf"); }
    void WriteRules(const std::string &content) { Write("/etc/kelosyslog/notify.conf", content); }
    void WriteSettings(const std::string &content) { Write("/etc/keloinfo.conf", content); }

    // A call of the service as the library makes it under this root.
    SentNotification Sent(const std::string &tag, std::map<std::string, std::string> values) const {
        return {tag, root_.File("usr/kelo/keloman/webman/modules/Quillbay/texts/"),
                root_.File("etc/kelosyslog/notify.filter"), std::move(values)};
    }
};

// Lines of an enabled rule's section.
inline std::string RuleText(const std::string &name, int type, const std::string &pri, const std::string &eps,
                            const std::string &pattern, const std::string &enable = "1") {
    return "[" + name + "]\nnotify_type=\"" + std::to_string(type) + "\"\nnotify_pri=\"" + pri +
           "\"\nnotify_eps=\"" + eps + "\"\nnotify_pat=\"" + pattern + "\"\nnotify_enable=\"" + enable +
           "\"\n";
}

} // namespace kelo::test
