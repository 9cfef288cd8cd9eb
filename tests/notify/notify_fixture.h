#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "kelosyslog/notification.h"
#include "support/notify_calls.h"
#include "support/platform_calls.h"
#include "support/syslog_capture.h"
#include "support/temp_root.h"

namespace kelo::test {

// A root of its own for the library and the platform, with captured messages and notifications. Checks at the
// end that no handle is left open.
class NotifyTest : public testing::Test {
protected:
    NotifyTest();
    ~NotifyTest() override;

    // Writes a file under the root, with its folders.
    void Write(const std::string &path, const std::string &content);
    std::string RulePath() const { return root_.File("etc/kelosyslog/notify.conf"); }
    void WriteRules(const std::string &content) { Write("/etc/kelosyslog/notify.conf", content); }
    void WriteSettings(const std::string &content) { Write("/etc/keloinfo.conf", content); }

    // A call of the service as the library makes it under this root.
    SentNotification Sent(const std::string &tag, std::map<std::string, std::string> values) const;

    // The texts written to the system log so far, which are then forgotten.
    std::vector<std::string> Messages();

    TempRoot root_;

private:
    SyslogCapture log_;
};

// Lines of an enabled rule's section.
std::string RuleText(const std::string &name, int type, const std::string &pri, const std::string &eps,
                     const std::string &pattern, const std::string &enable = "1");

} // namespace kelo::test
