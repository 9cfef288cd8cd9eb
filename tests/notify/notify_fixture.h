#pragma once

#include "kelosyslog/notification.h"
#include "support/test.h"

namespace kelo::test {

// A root with a rule file and settings.
class NotifyTest : public LibraryTest {
protected:
    void WriteRules(const std::string &content) { WriteFile(rules_, content); }
    void WriteSettings(const std::string &content) { WriteFile(root_.File("etc/keloinfo.conf"), content); }

    const std::string rules_ = root_.File("etc/kelosyslog/notify.conf");
};

// Lines of an enabled rule's section.
inline std::string RuleText(const std::string &name, int type, const std::string &pri, const std::string &eps,
                            const std::string &pattern, const std::string &enable = "1") {
    return "[" + name + "]\nnotify_type=\"" + std::to_string(type) + "\"\nnotify_pri=\"" + pri +
           "\"\nnotify_eps=\"" + eps + "\"\nnotify_pat=\"" + pattern + "\"\nnotify_enable=\"" + enable +
           "\"\n";
}

} // namespace kelo::test
