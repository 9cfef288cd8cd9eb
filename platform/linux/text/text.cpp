#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>

#include "keloplatform/torvc.h"

char *TORVCStrGet(const char *format, ...) {
    if (format == nullptr) {
        errno = EINVAL;
        return nullptr;
    }
    char *text = nullptr;
    va_list arguments;
    va_start(arguments, format);
    const int length = vasprintf(&text, format, arguments);
    va_end(arguments);
    return length >= 0 ? text : nullptr;
}

void TORVCStrPut(char *text) {
    std::free(text);
}
