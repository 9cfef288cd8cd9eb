#include "kelonotify/deliverer.h"

#include <syslog.h>

#include <algorithm>
#include <ctime>

#include "kelonotify/safe_text.h"

namespace kelo::tool {
namespace {

int64_t Now() {
    return static_cast<int64_t>(std::time(nullptr));
}

bool IsChannel(const std::string &name) {
    return std::find(std::begin(kChannelNames), std::end(kChannelNames), name) != std::end(kChannelNames);
}

// If the log server receives this line too, these words prevent a notification for it, which would fail as
// well.
const char *Words(const std::string &channel) {
    return channel == "mail" ? "Failed to send email." : "Failed to send notification.";
}

} // namespace

Deliverer::Deliverer(const Spool &spool, const Settings &settings, DelivererOptions options,
                     std::function<bool()> shouldStop)
    : spool_(spool), settings_(settings), options_(options), shouldStop_(std::move(shouldStop)) {}

int64_t Deliverer::Pass() {
    channels_.clear();
    health_ = spool_.ReadChannels();
    isForced_ = spool_.TakeRetryRequest();
    if (isForced_) {
        for (auto &[channel, attempts] : health_.targets)
            attempts.failures = 0, attempts.next = 0; // what is known stays until the channel has been tried
    }
    isAllDelivered_ = true;
    nextTry_ = -1;
    spool_.CleanUp(Now());
    for (const std::string &id : spool_.NewIds()) {
        if (shouldStop_()) {
            isAllDelivered_ = false;
            break;
        }
        Deliver(id);
    }
    channels_.clear(); // closes connections
    return nextTry_ < 0 ? -1 : std::max<int64_t>(nextTry_ - Now(), 0);
}

void Deliverer::Deliver(const std::string &id) {
    std::string problem;
    try {
        DeliverEntry(spool_.ReadNew(id));
    } catch (const EntryGone &) { // the administrator removed it
        return;
    } catch (const SpoolError &) {
        throw;
    } catch (const std::runtime_error &error) {
        problem = error.what();
    }
    if (!problem.empty())
        GiveUp(id, spool_.ReadProgress(id), problem);
}

std::map<std::string, std::vector<std::string>> Deliverer::OpenTargets(const Entry &entry,
                                                                       const Progress &progress) {
    std::map<std::string, std::vector<std::string>> open;
    for (const std::string &channel : entry.channels) {
        if (!IsChannel(channel))
            throw std::runtime_error("unknown channel '" + SafeLine(channel, 100) + "'");
        if (settings_.IsReadable() && !settings_.IsOn(channel))
            continue; // switched off since
        for (const std::string &target : ChannelOf(channel).Targets()) {
            const auto found = progress.targets.find(target);
            if (found == progress.targets.end() || !found->second.isDone)
                open[channel].push_back(target);
        }
    }
    return open;
}

void Deliverer::DeliverEntry(const Entry &entry) {
    Progress progress = spool_.ReadProgress(entry.id);
    const auto open = OpenTargets(entry, progress);
    size_t left = 0;
    for (const auto &[channel, targets] : open)
        left += targets.size();
    const bool isUntouched = progress.targets.empty() && progress.since == 0;
    if (left > 1 && isUntouched)
        spool_.SaveProgress(entry.id, progress); // before anything is sent: checks that it can be recorded
    for (const auto &[channel, targets] : open) {
        for (const std::string &target : targets) {
            if (shouldStop_() || !IsDue(channel, progress.targets[target]))
                continue;
            SendOne(entry, progress, channel, target);
            left -= progress.targets[target].isDone ? 1 : 0;
            if (left > 0)
                spool_.SaveProgress(entry.id, progress);
        }
    }
    if (left == 0) {
        spool_.Finish(entry.id);
        return;
    }
    isAllDelivered_ = false;
    const int64_t end = std::max(entry.time, progress.since) + options_.giveUpAfterSec;
    if (Now() >= end && !shouldStop_()) {
        GiveUp(entry.id, progress, "not delivered in time");
        return;
    }
    for (const auto &[channel, targets] : open) {
        const auto health = health_.targets.find(channel);
        for (const std::string &target : targets) {
            const Attempts &attempts = progress.targets[target];
            if (!attempts.isDone)
                Wait(std::min(
                    end, std::max(attempts.next, health != health_.targets.end() ? health->second.next : 0)));
        }
    }
}

bool Deliverer::IsDue(const std::string &channel, const Attempts &attempts) const {
    const auto health = health_.targets.find(channel);
    if (health != health_.targets.end() && health->second.next > Now())
        return false;
    return isForced_ || attempts.next <= Now();
}

void Deliverer::SendOne(const Entry &entry, Progress &progress, const std::string &channel,
                        const std::string &target) {
    const Result result = ChannelOf(channel).Send(entry, target);
    Attempts &attempts = progress.targets[target];
    if (result.outcome == Outcome::Sent)
        attempts = {true, 0, 0, ""};
    else if (result.outcome == Outcome::Refused)
        NoteFailure(attempts, result.reason, Now());
    else
        attempts.reason = result.reason;
    NoteRefusal(entry, channel, target, result);
    NoteChannel(channel, result);
}

// One line in the system log for each answer of a target, for any number of entries that it refuses.
void Deliverer::NoteRefusal(const Entry &entry, const std::string &channel, const std::string &target,
                            const Result &result) {
    if (result.outcome == Outcome::Sent)
        refusals_.erase(target);
    if (result.outcome != Outcome::Refused || refusals_[target] == result.reason)
        return;
    refusals_[target] = result.reason;
    syslog(LOG_WARNING, "%s %s, entry %s: %s", Words(channel), SafeLine(target, 300).c_str(),
           entry.id.c_str(), result.reason.c_str());
}

// One line in the system log when a channel fails, and one when it works again; the attempts between them are
// not logged.
void Deliverer::NoteChannel(const std::string &name, const Result &result) {
    const auto known = health_.targets.find(name);
    if (result.outcome == Outcome::Unreachable) {
        Attempts &attempts = health_.targets[name];
        NoteFailure(attempts, result.reason, Now());
        if (attempts.failures == 1)
            syslog(LOG_WARNING, "%s Channel %s: %s", Words(name), name.c_str(), result.reason.c_str());
    } else if (known != health_.targets.end()) {
        health_.targets.erase(known);
        syslog(LOG_NOTICE, "Channel %s works again", name.c_str());
    } else {
        return;
    }
    spool_.SaveChannels(health_);
}

void Deliverer::GiveUp(const std::string &id, Progress progress, const std::string &reason) {
    isAllDelivered_ = false;
    progress.reason = reason;
    spool_.GiveUp(id, progress);
    syslog(LOG_ERR, "Entry %s given up: %s", id.c_str(), SafeLine(reason, 300).c_str());
}

void Deliverer::Wait(int64_t until) {
    nextTry_ = nextTry_ < 0 ? until : std::min(nextTry_, until);
}

Channel &Deliverer::ChannelOf(const std::string &name) {
    std::unique_ptr<Channel> &channel = channels_[name];
    const ChannelOptions options{settings_, options_.timeoutSec, spool_};
    if (channel == nullptr && name == "mail")
        channel = MakeMailChannel(options);
    else if (channel == nullptr && name == "desktop")
        channel = MakeDesktopChannel(options);
    else if (channel == nullptr)
        channel = MakeHttpChannel(options, name);
    return *channel;
}

} // namespace kelo::tool
