#include "spool/channel_health.h"

namespace kelo::tool {

std::vector<ChannelHealth> ReadChannelHealth(const Spool &spool, const Settings &settings) {
    const Progress failures = spool.ReadChannels();
    std::vector<ChannelHealth> channels;
    for (const std::string_view name : kChannelNames) {
        ChannelHealth &health = channels.emplace_back();
        health.name = name;
        health.isOn = settings.IsOn(name);
        health.problem = health.isOn ? ChannelProblem(settings, name) : "";
        const auto found = failures.targets.find(health.name);
        if (health.isOn && health.problem.empty() && found != failures.targets.end()) {
            health.problem = found->second.reason;
            health.next = found->second.next;
        }
    }
    return channels;
}

} // namespace kelo::tool
