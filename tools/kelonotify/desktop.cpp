// The desktop channel: the feed, and a pop-up if there is a session.

#include <systemd/sd-bus.h>

#include <cerrno>
#include <cstring>
#include <memory>

#include "base/text_encoding.h"
#include "kelonotify/channel.h"
#include "kelonotify/feed.h"
#include "kelonotify/safe_text.h"

namespace kelo::tool {
namespace {

constexpr size_t kMaxBytes = 2000;

struct BusCloser {
    void operator()(sd_bus *bus) const { sd_bus_close_unref(bus); }
};
struct MessageFreer {
    void operator()(sd_bus_message *message) const { sd_bus_message_unref(message); }
};
using Message = std::unique_ptr<sd_bus_message, MessageFreer>;

// Best effort: the feed has the notification, and most machines have no session.
void PopUp(const Entry &entry, long timeoutSec) {
    sd_bus *opened = nullptr;
    if (sd_bus_open_user(&opened) < 0)
        return;
    const std::unique_ptr<sd_bus, BusCloser> bus(opened);
    sd_bus_message *created = nullptr;
    if (sd_bus_message_new_method_call(bus.get(), &created, "org.freedesktop.Notifications",
                                       "/org/freedesktop/Notifications", "org.freedesktop.Notifications",
                                       "Notify") < 0)
        return;
    const Message call(created);
    const std::string title = SafeLine(entry.title, kMaxBytes);
    // Notification servers read the body as markup.
    const std::string body = EscapeMarkup(SafeLines(entry.body, kMaxBytes), "&<>");
    // Name, identifier to replace, icon, title, body, actions, hints, time of display in ms (the server's).
    if (sd_bus_message_append(call.get(), "susssasa{sv}i", "kelosyslog", 0U, "", title.c_str(), body.c_str(),
                              0, 0, -1) < 0)
        return;
    sd_bus_call(bus.get(), call.get(), static_cast<uint64_t>(timeoutSec) * 1'000'000, nullptr, nullptr);
}

class DesktopChannel final : public Channel {
public:
    explicit DesktopChannel(const ChannelOptions &options)
        : feed_(options.spool), folder_(options.spool.File("desktop")), timeoutSec_(options.timeoutSec) {}

    std::vector<std::string> Targets() const override { return {"desktop"}; }

    Result Send(const Entry &entry, const std::string &) override {
        const Feed::Added added = feed_.Add(entry);
        if (added == Feed::Added::No)
            return {Outcome::Unreachable, folder_ + ": " + std::strerror(errno)};
        if (added == Feed::Added::Yes)
            PopUp(entry, timeoutSec_);
        return {};
    }

private:
    Feed feed_;
    std::string folder_;
    long timeoutSec_;
};

} // namespace

std::unique_ptr<Channel> MakeDesktopChannel(const ChannelOptions &options) {
    return std::make_unique<DesktopChannel>(options);
}

} // namespace kelo::tool
