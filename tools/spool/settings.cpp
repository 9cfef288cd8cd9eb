#include "spool/settings.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "keloplatform/torvc.h"

namespace kelo::tool {
namespace {

std::string SwitchKey(std::string_view channel) {
    return channel == "mail" ? "smtp_mail_enabled" : Settings::Prefix(channel) + "enabled";
}

} // namespace

std::string Settings::Get(const std::string &key) const {
    std::string value(256, '\0');
    for (;;) {
        const int length = TORVCFileGetKeyValue(path_.c_str(), key.c_str(), value.data(), value.size(), 0);
        if (length < 0)
            return "";
        if (static_cast<size_t>(length) < value.size())
            return value.substr(0, static_cast<size_t>(length));
        value.assign(static_cast<size_t>(length) + 1, '\0');
    }
}

std::vector<std::string> Settings::GetList(const std::string &key) const {
    constexpr const char *kSeparators = ",; \t";
    const std::string text = Get(key);
    std::vector<std::string> words;
    for (size_t at = text.find_first_not_of(kSeparators); at != std::string::npos;) {
        const size_t end = text.find_first_of(kSeparators, at);
        words.push_back(text.substr(at, end - at));
        at = text.find_first_not_of(kSeparators, end);
    }
    return words;
}

bool Settings::IsOn(std::string_view channel) const {
    const std::string value = Get(SwitchKey(channel));
    return value == "yes" || (channel == "desktop" && value.empty());
}

std::string Settings::Prefix(std::string_view channel) {
    if (channel == "mail")
        return "smtp_";
    if (channel.starts_with("push_"))
        return "pushservice_" + std::string(channel.substr(5)) + "_";
    return std::string(channel) + "_";
}

bool Settings::IsReadable() const {
    return access(path_.c_str(), R_OK) == 0;
}

std::string Settings::Problem() const {
    if (IsReadable() || errno == ENOENT)
        return "";
    return path_ + ": " + std::strerror(errno);
}

bool Settings::IsOpenToOthers() const {
    struct stat status;
    return stat(path_.c_str(), &status) == 0 && (status.st_mode & S_IROTH) != 0;
}

std::string ChannelProblem(const Settings &settings, std::string_view channel) {
    if (const std::string problem = settings.Problem(); !problem.empty())
        return problem;
    std::vector<std::string> needed;
    if (channel == "mail")
        needed = {"smtp_server", "smtp_from", "smtp_to"};
    else if (channel == "sms")
        needed = {"sms_url", "sms_to"};
    else if (channel.starts_with("push_"))
        needed = {Settings::Prefix(channel) + "url"};
    for (const std::string &key : needed) {
        if (settings.GetList(key).empty())
            return key + " is missing in " + settings.Path();
    }
    return "";
}

} // namespace kelo::tool
