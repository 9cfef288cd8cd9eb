#include "notify/settings.h"

#include <cerrno>

#include "common/root.h"
#include "files/refusal.h"

namespace kelo::platform {

Settings::Settings() : path_(RootedPath("/etc/keloinfo.conf")), text_(LoadSectionText(path_)) {}

std::string Settings::Get(std::string_view key, std::string_view fallback) const {
    const std::optional<std::string_view> value = text_ != nullptr ? text_->FindKey(key) : std::nullopt;
    return std::string(value.value_or(fallback));
}

bool Settings::IsOn(std::string_view key, bool fallback) const {
    return Get(key, fallback ? "yes" : "no") == "yes";
}

bool Settings::CopyTo(char *field, size_t size, std::string_view key) const {
    const std::string value = Get(key);
    field[0] = '\0';
    if (value.size() >= size) {
        ReportRefusal(path_, 0, "the value of " + std::string(key) + " is too long");
        errno = EBADMSG;
        return false;
    }
    value.copy(field, value.size());
    field[value.size()] = '\0';
    return true;
}

} // namespace kelo::platform
