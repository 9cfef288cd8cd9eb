#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>

#include "common/failure.h"
#include "keloplatform/torvc.h"

using kelo::platform::Recorded;

char *TORVCStrGet(const char *format, ...) {
    if (format == nullptr) {
        errno = EINVAL;
        return Recorded("TORVCStrGet", nullptr, static_cast<char *>(nullptr));
    }
    char *text = nullptr;
    va_list arguments;
    va_start(arguments, format);
    const int length = vasprintf(&text, format, arguments);
    va_end(arguments);
    return Recorded("TORVCStrGet", nullptr, length >= 0 ? text : nullptr);
}

void TORVCStrPut(char *text) {
    std::free(text);
}
