#include "kelosyslog/utils.h"

#include "common/failure.h"

namespace {

int32_t Refuse(const char *reason) {
    return kelo::Fail(KELO_FAILURE_ARGUMENT, "", "EncodeJson", reason);
}

} // namespace

int32_t EncodeJson(const char *source, char *destination, int32_t size) {
    if (source == nullptr || destination == nullptr || source == destination)
        return Refuse("a null pointer, or one place for both texts");
    int64_t written = 0;
    for (const char *byte = source; *byte != '\0'; ++byte) {
        const bool escaped = *byte == '"' || *byte == '\\';
        if (written + (escaped ? 2 : 1) > size)
            return Refuse("the result does not fit");
        if (escaped)
            destination[written++] = '\\';
        destination[written++] = *byte;
    }
    if (written >= size)
        return Refuse("the result does not fit");
    destination[written] = '\0';
    return 0;
}
