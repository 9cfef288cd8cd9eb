#include <cstring>

#include "keloplatform/kelodb.h"

namespace {

// Copies `inLen` bytes with `escape(byte)` before a byte unless it is NUL.
template <typename EscapeOf>
int CopyEscaped(char *out, size_t outSize, const char *in, size_t inLen, EscapeOf escapeOf) {
    if (out == nullptr || in == nullptr)
        return -1;
    size_t written = 0;
    for (size_t i = 0; i < inLen; ++i) {
        const char byte = in[i];
        const char escape = escapeOf(byte);
        if (byte == '\0' || written + (escape != '\0' ? 2 : 1) >= outSize)
            return -1;
        if (escape != '\0')
            out[written++] = escape;
        out[written++] = byte;
    }
    if (written >= outSize)
        return -1;
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
        return -1;
    return CopyEscaped(out, outSize, in, std::strlen(in),
                       [](char byte) { return byte == '%' || byte == '_' || byte == '\\' ? '\\' : '\0'; });
}
