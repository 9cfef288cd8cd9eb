#include <cstring>

#include "common/failure.h"
#include "keloplatform/kelodb.h"

namespace {

int Refuse(const char *reason) {
    return kelo::platform::Fail(KELO_FAILURE_ARGUMENT, "KELODBEscapeStringEX", "", reason);
}

// Copies `inLen` bytes with `escape(byte)` before a byte unless it is NUL.
template <typename EscapeOf>
int CopyEscaped(char *out, size_t outSize, const char *in, size_t inLen, EscapeOf escapeOf) {
    if (out == nullptr || in == nullptr)
        return Refuse("a null pointer");
    size_t written = 0;
    for (size_t i = 0; i < inLen; ++i) {
        const char byte = in[i];
        const char escape = escapeOf(byte);
        if (byte == '\0' || written + (escape != '\0' ? 2 : 1) >= outSize)
            return Refuse(byte == '\0' ? "the text holds a NUL byte" : "the result does not fit");
        if (escape != '\0')
            out[written++] = escape;
        out[written++] = byte;
    }
    if (written >= outSize)
        return Refuse("the result does not fit");
    out[written] = '\0';
    return static_cast<int>(written);
}

} // namespace

int KELODBEscapeStringEX(DBConnect_tag *, char *out, size_t outSize, const char *in, size_t inLen) {
    return CopyEscaped(out, outSize, in, inLen, [](char byte) { return byte == '\'' ? '\'' : '\0'; });
}

int KELODBEscapeStringEX2(DBConnect_tag *connection, char *out, size_t outSize, const char *in,
                          size_t inLen) {
    return KELODBEscapeStringEX(connection, out, outSize, in, inLen);
}

int KELODBEscapeBackslashEX2(DBConnect_tag *, char *out, size_t outSize, const char *in) {
    if (in == nullptr)
        return Refuse("a null pointer");
    return CopyEscaped(out, outSize, in, std::strlen(in),
                       [](char byte) { return byte == '%' || byte == '_' || byte == '\\' ? '\\' : '\0'; });
}
