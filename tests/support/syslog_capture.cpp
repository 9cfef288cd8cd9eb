#include "support/syslog_capture.h"

#include <syslog.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <mutex>

#include "support/fault_pause.h"

namespace kelo::test {
namespace {

SyslogCapture *active = nullptr;
std::mutex activeMutex; // messages may come from any thread

// Formats as vsyslog does; %m works because glibc's printf family knows it.
void Capture(int priority, const char *format, va_list arguments) {
    const int savedErrno = errno;
    const FaultPause pause;
    char *text = nullptr;
    if (vasprintf(&text, format, arguments) >= 0)
        SyslogCapture::Receive(priority, text);
    std::free(text);
    errno = savedErrno;
}

} // namespace

std::ostream &operator<<(std::ostream &out, const SyslogMessage &message) {
    return out << "<" << message.priority << "> " << message.text;
}

SyslogCapture::SyslogCapture() {
    const std::lock_guard lock(activeMutex);
    active = this;
}
SyslogCapture::~SyslogCapture() {
    const std::lock_guard lock(activeMutex);
    active = nullptr;
}
void SyslogCapture::Receive(int priority, const std::string &text) {
    const std::lock_guard lock(activeMutex);
    if (active != nullptr)
        active->messages_.push_back({priority, text});
}

std::vector<std::string> SyslogCapture::Texts() const {
    std::vector<std::string> texts;
    for (const SyslogMessage &message : messages_)
        texts.push_back(message.text);
    return texts;
}

} // namespace kelo::test

// Fortified builds call the _chk form.
extern "C" {

void syslog(int priority, const char *format, ...) {
    va_list arguments;
    va_start(arguments, format);
    kelo::test::Capture(priority, format, arguments);
    va_end(arguments);
}

void __syslog_chk(int priority, int, const char *format, ...) {
    va_list arguments;
    va_start(arguments, format);
    kelo::test::Capture(priority, format, arguments);
    va_end(arguments);
}

} // extern "C"
