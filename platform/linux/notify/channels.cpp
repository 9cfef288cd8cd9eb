#include "notify/channels.h"

#include <cerrno>
#include <cstring>

#include "files/refusal.h"

namespace kelo::platform {
namespace {

constexpr std::string_view kSeparators = ",; \t";

struct Channel {
    std::string_view name;
    std::string_view group;
    std::string_view switchKey;
    bool isOnByDefault;
};
constexpr Channel kChannels[] = {
    {"mail", "mail", "smtp_mail_enabled", false},
    {"sms", "sms", "sms_enabled", false},
    {"push_mobile", "push", "pushservice_mobile_enabled", false},
    {"push_msn", "push", "pushservice_msn_enabled", false},
    {"push_skype", "push", "pushservice_skype_enabled", false},
    {"desktop", "desktop", "desktop_enabled", true},
};

// Whether a word of the filter file names the channel.
bool Names(std::string_view word, const Channel &channel) {
    return word == channel.name || word == channel.group || word == "all";
}

bool IsKnown(std::string_view word) {
    for (const Channel &channel : kChannels) {
        if (Names(word, channel))
            return true;
    }
    return word == "none";
}

std::vector<std::string_view> Words(std::string_view text) {
    std::vector<std::string_view> words;
    for (;;) {
        const size_t begin = text.find_first_not_of(kSeparators);
        if (begin == std::string_view::npos)
            return words;
        text.remove_prefix(begin);
        const size_t end = std::min(text.find_first_of(kSeparators), text.size());
        words.push_back(text.substr(0, end));
        text.remove_prefix(end);
    }
}

// The value of the tag in the filter file; "all" if the file or the tag is missing.
std::string FilterOf(const std::string &path, std::string_view tag) {
    if (path.empty())
        return "all";
    const std::shared_ptr<const SectionText> text = LoadSectionText(path);
    if (text == nullptr && errno != ENOENT)
        ReportRefusal(path, 0, std::string("not read, every channel is used: ") + std::strerror(errno));
    if (text == nullptr)
        return "all";
    return std::string(text->FindKey(tag).value_or("all"));
}

} // namespace

std::vector<std::string_view> WantedChannels(const Settings &settings, const std::string &filterFile,
                                             std::string_view tag) {
    const std::string filter = FilterOf(filterFile, tag);
    const std::vector<std::string_view> words = Words(filter);
    for (const std::string_view word : words) {
        if (!IsKnown(word))
            ReportRefusal(filterFile, 0, "no such channel: " + std::string(word));
    }
    std::vector<std::string_view> wanted;
    for (const Channel &channel : kChannels) {
        bool isAllowed = false;
        for (const std::string_view word : words)
            isAllowed = isAllowed || Names(word, channel);
        if (isAllowed && settings.IsOn(channel.switchKey, channel.isOnByDefault))
            wanted.push_back(channel.name);
    }
    return wanted;
}

} // namespace kelo::platform
