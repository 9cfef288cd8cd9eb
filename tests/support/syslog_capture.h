#pragma once

#include <ostream>
#include <string>
#include <vector>

namespace kelo::test {

struct SyslogMessage {
    int priority = 0;
    std::string text;
    bool operator==(const SyslogMessage &) const = default;
};
std::ostream &operator<<(std::ostream &out, const SyslogMessage &message);

// Collects what the process writes to the system log while the object lives (one at a time). Outside,
// messages vanish: no test writes to the machine's log.
class SyslogCapture {
public:
    SyslogCapture();
    ~SyslogCapture();
    SyslogCapture(const SyslogCapture &) = delete;
    SyslogCapture &operator=(const SyslogCapture &) = delete;

    const std::vector<SyslogMessage> &Messages() const { return messages_; }
    std::vector<std::string> Texts() const;
    void Clear() { messages_.clear(); }

    // For the replaced syslog().
    static void Receive(int priority, const std::string &text);

private:
    std::vector<SyslogMessage> messages_;
};

} // namespace kelo::test
