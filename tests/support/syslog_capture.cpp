#include "support/syslog_capture.h"

#include <syslog.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <mutex>

#include "support/doubles.h"

namespace kelo::test {
namespace {

bool isActive = false;
std::vector<SyslogMessage> messages;
std::mutex mutex; // messages may come from any thread

// Formats as vsyslog does; %m works because glibc's printf family knows it.
void Capture(int priority, const char *format, va_list arguments) {
    const int savedErrno = errno;
    const FaultPause pause;
    const std::lock_guard lock(mutex);
    char *text = nullptr;
    if (isActive && vasprintf(&text, format, arguments) >= 0)
        messages.emplace_back(priority, text);
    std::free(text);
    errno = savedErrno;
}

} // namespace

SyslogCapture::SyslogCapture() {
    Take();
    isActive = true;
}
SyslogCapture::~SyslogCapture() {
    isActive = false;
}

std::vector<SyslogMessage> SyslogCapture::Take() {
    const std::lock_guard lock(mutex);
    return std::exchange(messages, {});
}

std::vector<std::string> SyslogCapture::TakeTexts() {
    std::vector<std::string> texts;
    for (const auto &[priority, text] : Take())
        texts.push_back(text);
    return texts;
}

} // namespace kelo::test

// Fortified builds call the _chk form.
#define KELO_CAPTURE                                                                                         \
    va_list arguments;                                                                                       \
    va_start(arguments, format);                                                                             \
    kelo::test::Capture(priority, format, arguments);                                                        \
    va_end(arguments);

extern "C" void syslog(int priority, const char *format, ...) {
    KELO_CAPTURE
}
extern "C" void __syslog_chk(int priority, int, const char *format, ...) {
    KELO_CAPTURE
}
