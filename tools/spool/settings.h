#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace kelo::tool {

// The channels that notifications may be sent through.
inline constexpr std::string_view kChannelNames[] = {"mail",     "sms",        "push_mobile",
                                                     "push_msn", "push_skype", "desktop"};

// The appliance's settings, keloinfo.conf(5). Every value is read again each time.
class Settings {
public:
    explicit Settings(const std::string &root) : path_(root + "/etc/keloinfo.conf") {}

    const std::string &Path() const { return path_; }

    // The value; "" if it, or the file, is missing.
    std::string Get(const std::string &key) const;
    // The words of a list that commas, semicolons or blanks separate.
    std::vector<std::string> GetList(const std::string &key) const;

    // Whether the channel is switched on.
    bool IsOn(std::string_view channel) const;
    // Prefix of the channel's keys: "pushservice_mobile_" for "push_mobile".
    static std::string Prefix(std::string_view channel);

    bool IsReadable() const;
    // Why the file cannot be read; "" when it can, or is missing.
    std::string Problem() const;
    // Whether the file, which has passwords, is readable for all users.
    bool IsOpenToOthers() const;

private:
    std::string path_;
};

// What prevents every delivery through the channel, such as a missing key; "" for nothing.
std::string ChannelProblem(const Settings &settings, std::string_view channel);

} // namespace kelo::tool
