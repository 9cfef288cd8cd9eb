#include <algorithm>
#include <cstring>

#include "common/catch_bad_alloc.h"
#include "common/failure.h"
#include "files/section_cache.h"
#include "keloplatform/torvc.h"

using namespace kelo::platform;

int TORVCFileGetKeyValue(const char *path, const char *key, char *buffer, size_t size, int) {
    if (buffer != nullptr && size > 0)
        buffer[0] = '\0';
    if (path == nullptr || key == nullptr || buffer == nullptr || size == 0) {
        errno = EINVAL;
        return Recorded("TORVCFileGetKeyValue", path, -1);
    }
    const auto copy = [&] {
        const std::shared_ptr<const SectionText> text = LoadSectionText(path);
        if (text == nullptr)
            return -1;
        const std::optional<std::string_view> value = text->FindKey(key);
        if (!value) {
            errno = ENOENT;
            return -1;
        }
        const size_t length = std::min(value->size(), size - 1);
        std::memcpy(buffer, value->data(), length);
        buffer[length] = '\0';
        return static_cast<int>(value->size()); // below kMaxTextFileBytes
    };
    return Recorded("TORVCFileGetKeyValue", path, CatchBadAlloc(-1, copy));
}
