#pragma once

#include <string>
#include <utility>
#include <vector>

namespace kelo::test {

using SyslogMessage = std::pair<int, std::string>; // priority and text

// Collects what the process writes to the system log while the object lives (one at a time). Outside,
// messages vanish: no test writes to the machine's log.
class SyslogCapture {
public:
    SyslogCapture();
    ~SyslogCapture();
    SyslogCapture(const SyslogCapture &) = delete;
    SyslogCapture &operator=(const SyslogCapture &) = delete;

    // The messages, or their texts alone, since the last call of one of the two.
    std::vector<SyslogMessage> Take();
    std::vector<std::string> TakeTexts();
};

} // namespace kelo::test
