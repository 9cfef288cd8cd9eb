#pragma once

#include <functional>
#include <map>
#include <memory>
#include <string>

#include "kelonotify/channel.h"
#include "spool/spool.h"

namespace kelo::tool {

struct DelivererOptions {
    long timeoutSec = 30;               // of each step on a network
    int64_t giveUpAfterSec = 3 * 86400; // age of an entry
};

// Delivers the entries of the spool. The caller holds the spool's lock.
//
// A success is on the disk before the next delivery begins, so that a kill can repeat only the delivery in
// progress. An entry with several targets is not begun before its record was written once; so a disk that
// cannot take records stops the delivery instead of repeating it.
class Deliverer {
public:
    // `shouldStop` is asked between two deliveries.
    Deliverer(const Spool &spool, const Settings &settings, DelivererOptions options,
              std::function<bool()> shouldStop);

    // One pass over the spool. Returns the seconds until the next attempt; -1 when nothing
    // waits. Throws SpoolError.
    int64_t Pass();

    // Whether everything of the last pass was delivered.
    bool IsAllDelivered() const { return isAllDelivered_; }

private:
    void Deliver(const std::string &id);
    void DeliverEntry(const Entry &entry);
    std::map<std::string, std::vector<std::string>> OpenTargets(const Entry &entry, const Progress &progress);
    void SendOne(const Entry &entry, Progress &progress, const std::string &channel,
                 const std::string &target);
    bool IsDue(const std::string &channel, const Attempts &attempts) const;
    void NoteRefusal(const Entry &entry, const std::string &channel, const std::string &target,
                     const Result &result);
    void NoteChannel(const std::string &name, const Result &result);
    void GiveUp(const std::string &id, Progress progress, const std::string &reason);
    void Wait(int64_t until);
    Channel &ChannelOf(const std::string &name);

    const Spool &spool_;
    const Settings &settings_;
    DelivererOptions options_;
    std::function<bool()> shouldStop_;
    std::map<std::string, std::unique_ptr<Channel>> channels_; // as the settings are in this pass
    Progress health_;                                          // of the channels
    std::map<std::string, std::string> refusals_;              // by target, the reason that was logged last
    bool isForced_ = false;
    bool isAllDelivered_ = true;
    int64_t nextTry_ = -1;
};

} // namespace kelo::tool
