#include "kelosyslog/utils.h"

int32_t EncodeJson(const char *source, char *destination, int32_t size) {
    if (source == nullptr || destination == nullptr || source == destination)
        return -1;
    int64_t written = 0;
    for (const char *byte = source; *byte != '\0'; ++byte) {
        const bool escaped = *byte == '"' || *byte == '\\';
        if (written + (escaped ? 2 : 1) > size)
            return -1;
        if (escaped)
            destination[written++] = '\\';
        destination[written++] = *byte;
    }
    if (written >= size)
        return -1;
    destination[written] = '\0';
    return 0;
}
