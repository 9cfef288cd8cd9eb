#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <string>

#include "site.h"

namespace kelo::stress {

// What leaves the disk under test while it is in use: it would be full for ever.
class Attic {
public:
    explicit Attic(const Site &site) : site_(site) {}

    // Moves databases that were set aside, archives and notifications to the attic; not those that
    // `isOpen` names. No process may run meanwhile.
    void Take(const std::function<bool(const std::string &)> &isOpen);

    // There is a reason to set this file aside. It is torn if its write-ahead log was damaged: what its tree
    // of pages holds is not known then.
    void Expect(ino_t inode, bool isTorn = false) { isTorn_[inode] |= isTorn; }

    uint64_t SetAside() const { return setAside_; }
    // Files that were set aside without a reason.
    uint64_t Unexpected() const { return unexpected_; }
    uint64_t Notifications() const { return notifications_; }

private:
    void TakeSetAside(Database database, const std::function<bool(const std::string &)> &isOpen);
    void TakeArchives(const std::function<bool(const std::string &)> &isOpen);
    void TakeNotifications();
    void Move(const std::string &path, const std::string &name) const;

    const Site &site_;
    std::map<ino_t, bool> isTorn_;
    uint64_t number_ = 0;
    uint64_t setAside_ = 0;
    uint64_t unexpected_ = 0;
    uint64_t notifications_ = 0;
};

} // namespace kelo::stress
