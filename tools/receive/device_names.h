#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <unordered_set>

namespace kelo::tool {

// The names under which records are counted. Whoever can send can claim any number of names, and the
// accounting keeps and rewrites each one from then on; so a name is cut to 255 bytes, and names beyond a
// limit count as kOthers.
class DeviceNames {
public:
    static constexpr const char *kOthers = "(others)";

    explicit DeviceNames(size_t limit) : limit_(limit) {}

    // Replaces the known names by those of `devices`, which have a member `device`.
    template <typename Devices>
    void Load(const Devices &devices) {
        names_.clear();
        for (const auto &entry : devices) {
            if (entry.device != kOthers)
                names_.insert(entry.device);
        }
    }

    // The name under which a record of `host`, a text of any bytes up to its first NUL, is counted. Valid
    // until the next call.
    const std::string &NameFor(const std::string &host);

    // Records counted as kOthers.
    uint64_t Others() const { return others_; }

private:
    struct Hash {
        using is_transparent = void;
        size_t operator()(std::string_view name) const { return std::hash<std::string_view>()(name); }
    };

    size_t limit_;
    std::unordered_set<std::string, Hash, std::equal_to<>> names_;
    const std::string othersName_ = kOthers;
    uint64_t others_ = 0;
};

} // namespace kelo::tool
