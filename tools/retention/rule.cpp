#include "retention/rule.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstring>
#include <map>
#include <sstream>

#include "archive/retention.h"
#include "base/errors.h"
#include "base/files.h"
#include "read/time_expression.h"

namespace kelo::tool {
namespace {

constexpr uint64_t kLeastBytes = uint64_t{16} << 20;
constexpr int64_t kLeastAgeSec = 3600;
constexpr uint64_t kMostPercent = 50;
constexpr const char *kKeys[] = {"keep", "keep_size", "min_free", "when_full"};

std::string Trim(const std::string &text) {
    constexpr const char *kBlanks = " \t\r";
    const size_t first = text.find_first_not_of(kBlanks);
    return first == std::string::npos ? "" : text.substr(first, text.find_last_not_of(kBlanks) + 1 - first);
}

struct Setting {
    std::string where; // "FILE:LINE: KEY"
    std::string value;

    [[noreturn]] void Refuse(const std::string &reason) const { throw DatabaseError(where + ": " + reason); }
};
using Settings = std::map<std::string, Setting>;

// Lines KEY="VALUE", blank ones, and comments after #.
Settings ReadSettings(const std::string &path) {
    Settings settings;
    const std::optional<std::string> content = ReadWhole(path);
    if (!content && errno == ENOENT)
        return settings;
    if (!content)
        throw DatabaseError(path + ": " + std::strerror(errno));
    std::istringstream lines(*content);
    std::string line;
    for (int number = 1; std::getline(lines, line); ++number) {
        line = Trim(line);
        if (line.empty() || line.front() == '#')
            continue;
        const size_t sign = line.find('=');
        const std::string key = Trim(line.substr(0, sign));
        Setting setting{path + ":" + std::to_string(number) + ": " + key, ""};
        if (sign == std::string::npos ||
            std::find(std::begin(kKeys), std::end(kKeys), key) == std::end(kKeys))
            setting.Refuse("no setting; settings are keep, keep_size, min_free, when_full");
        setting.value = Trim(line.substr(sign + 1));
        if (setting.value.size() >= 2 && setting.value.front() == '"' && setting.value.back() == '"')
            setting.value = setting.value.substr(1, setting.value.size() - 2);
        if (!settings.emplace(key, setting).second)
            setting.Refuse("is set twice");
    }
    return settings;
}

// "90d", "2 weeks": an age and no date.
void TakeAge(const Setting &setting, RetentionRule &rule) {
    constexpr int64_t kNow = int64_t{1} << 33; // any
    const std::string &text = setting.value;
    const bool isAge = text.find_first_not_of("0123456789 abcdefghijklmnopqrstuvwxyz") == std::string::npos &&
                       text.find_first_of("0123456789") == 0 &&
                       text.find_first_of("abcdefghijklmnopqrstuvwxyz") != std::string::npos;
    try {
        rule.keepSec = isAge ? kNow - ParseTimeExpression("keep", text, kNow).seconds : 0;
    } catch (const UsageError &) {
        rule.keepSec = 0;
    }
    if (rule.keepSec <= 0)
        setting.Refuse("'" + text + "' is no age; write for example 90d");
    if (rule.keepSec < kLeastAgeSec)
        setting.Refuse("'" + text + "' would remove what has just arrived; the least is 1h");
    rule.keep = text;
}

uint64_t SizeOf(const Setting &setting) {
    try {
        return ParseSize("", setting.value);
    } catch (const UsageError &) {
        setting.Refuse("'" + setting.value + "' is no size; write for example 500M or 20G");
    }
}

void TakeSize(const Setting &setting, const VolumeStatus &volume, RetentionRule &rule) {
    rule.keepBytes = SizeOf(setting);
    if (rule.keepBytes < kLeastBytes)
        setting.Refuse("'" + setting.value + "' would remove nearly everything; the least is 16M");
    if (rule.keepBytes >= volume.size)
        setting.Refuse("'" + setting.value + "' has no effect: the volume has " + FormatSize(volume.size));
}

void TakeFree(const Setting &setting, const VolumeStatus &volume, RetentionRule &rule) {
    const std::string &text = setting.value;
    uint64_t percent = 0;
    const auto [stop, error] = std::from_chars(text.data(), text.data() + text.size(), percent);
    if (error == std::errc() && std::string_view(stop, text.data() + text.size()) == "%")
        rule.minFreeBytes = percent > kMostPercent ? volume.size : volume.size / 100 * percent;
    else
        rule.minFreeBytes = SizeOf(setting);
    if (rule.minFreeBytes > volume.size / 100 * kMostPercent)
        setting.Refuse("'" + text + "' is more than half of the volume, which has " +
                       FormatSize(volume.size));
    if (rule.minFreeBytes <= VolumeStatus::kFullBytes)
        setting.Refuse("'" + text + "' is too late: with " + FormatSize(VolumeStatus::kFullBytes) +
                       " free a volume is full");
    rule.minFree = text;
}

void TakeAction(const Setting &setting, RetentionRule &rule) {
    using WhenFull = RetentionRule::WhenFull;
    if (setting.value != "remove" && setting.value != "stop")
        setting.Refuse("'" + setting.value + "' is neither remove nor stop");
    rule.whenFull = setting.value == "remove" ? WhenFull::kRemove : WhenFull::kStop;
}

} // namespace

std::string RetentionFilePath(const std::string &root) {
    return root + "/etc/kelosyslog/retention.conf";
}

std::optional<RetentionRule> LoadRetentionRule(const std::string &root, const VolumeStatus &volume) {
    const Settings settings = ReadSettings(RetentionFilePath(root));
    if (settings.empty())
        return std::nullopt;
    RetentionRule rule;
    for (const auto &[key, setting] : settings) {
        if (key == "keep")
            TakeAge(setting, rule);
        else if (key == "keep_size")
            TakeSize(setting, volume, rule);
        else if (key == "min_free")
            TakeFree(setting, volume, rule);
        else
            TakeAction(setting, rule);
    }
    if (settings.contains("min_free") && !settings.contains("when_full"))
        settings.at("min_free").Refuse("needs when_full, \"remove\" or \"stop\"");
    if (settings.contains("when_full") && !settings.contains("min_free"))
        settings.at("when_full").Refuse("needs min_free, for example \"5%\"");
    return rule;
}

std::string DescribeRetention(const RetentionRule &rule) {
    using WhenFull = RetentionRule::WhenFull;
    std::string text;
    const auto add = [&text](const std::string &part) { text += (text.empty() ? "" : "; ") + part; };
    if (rule.keepSec > 0)
        add("records of the last " + rule.keep);
    if (rule.keepBytes > 0)
        add("at most " + FormatSize(rule.keepBytes));
    if (rule.whenFull != WhenFull::kNothing)
        add("below " + rule.minFree + " free " +
            (rule.whenFull == WhenFull::kRemove ? "the oldest are removed" : "receiving stops"));
    return text;
}

} // namespace kelo::tool
