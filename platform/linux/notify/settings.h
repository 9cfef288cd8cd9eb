#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "files/section_cache.h"

namespace kelo::platform {

// The appliance's settings at one moment.
class Settings {
public:
    // Reads /etc/keloinfo.conf under the platform's root. Check IsLoaded; if it is not, errno says why
    // and every setting is missing.
    Settings();

    bool IsLoaded() const { return text_ != nullptr; }
    const std::string &Path() const { return path_; }

    // The value of `key`, or `fallback` if it is missing.
    std::string Get(std::string_view key, std::string_view fallback = "") const;
    // Whether the value is exactly "yes".
    bool IsOn(std::string_view key, bool fallback = false) const;

    // Copies the value to a field of a record. False after a report, with the field empty, when it does not
    // fit.
    template <size_t size>
    bool CopyTo(char (&field)[size], std::string_view key) const {
        return CopyTo(field, size, key);
    }

private:
    bool CopyTo(char *field, size_t size, std::string_view key) const;

    std::string path_;
    std::shared_ptr<const SectionText> text_;
};

} // namespace kelo::platform
