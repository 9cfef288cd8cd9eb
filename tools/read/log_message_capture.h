#pragma once

#include <string>

namespace kelo::tool {

// Reads along what the process writes to the system log while the object lives.
//
// The keyword language reports a broken regular expression only there, yet the user should see it. The
// messages are copied to the standard error by the C library and picked up from there, so the process must
// not have other threads that write to it. When that cannot be set up, nothing is captured.
class LogMessageCapture {
public:
    LogMessageCapture();
    ~LogMessageCapture();
    LogMessageCapture(const LogMessageCapture &) = delete;
    LogMessageCapture &operator=(const LogMessageCapture &) = delete;

    // The first message so far, without the program's name; "" when there was none.
    std::string FirstLine() const;

private:
    int file_ = -1;
    int savedError_ = -1;
};

} // namespace kelo::tool
