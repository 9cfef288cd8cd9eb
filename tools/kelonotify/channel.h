#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "spool/settings.h"
#include "spool/spool.h"

namespace kelo::tool {

enum class Outcome {
    Sent,
    Refused,     // this notification or target: others may go through
    Unreachable, // nothing goes through the channel at present
};

struct Result {
    Outcome outcome = Outcome::Sent;
    std::string reason = {}; // of a failure; contains nothing secret
};

// A channel of delivery. It is created for one pass, with the settings of that moment.
class Channel {
public:
    virtual ~Channel() = default;

    // Its targets: the names under which the success of each is recorded. Never empty.
    virtual std::vector<std::string> Targets() const = 0;

    // Delivers to one of them. Returns within twice the time-out that the channel was created with.
    virtual Result Send(const Entry &entry, const std::string &target) = 0;
};

struct ChannelOptions {
    const Settings &settings;
    long timeoutSec;
    const Spool &spool; // which has the feed of the desktop channel
};

std::unique_ptr<Channel> MakeMailChannel(const ChannelOptions &options);
// "sms" and the push services.
std::unique_ptr<Channel> MakeHttpChannel(const ChannelOptions &options, const std::string &name);
std::unique_ptr<Channel> MakeDesktopChannel(const ChannelOptions &options);

} // namespace kelo::tool
