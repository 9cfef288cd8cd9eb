#pragma once

#include <functional>
#include <string>
#include <vector>

#include "retention/reception.h"
#include "retention/rule.h"
#include "retention/working_log.h"

namespace kelo::tool {

// Follows the rule of retention once: removes records of the working log, and stops or resumes receiving.
class RetentionRun {
public:
    // `report` gets a line for everything that was done. Throws DatabaseError.
    RetentionRun(const std::string &root, RetentionRule rule, VolumeStatus volume, bool isDryRun,
                 std::function<void(const std::string &)> report);

    // What is to be done at this moment, one line each; empty for nothing. Throws DatabaseError if it would
    // remove everything.
    std::vector<std::string> Plan();

    // Does it, and returns whether there was anything. A volume that has become low is told once, by an event
    // and a notification. Throws DatabaseError, OutputError and Interrupted.
    bool Execute();

private:
    using Room = WorkingLog::Room;

    uint64_t FreeWith(const Room &room) const { return volume_.free + room.reusable; }
    std::string FreeText(const Room &room) const;
    bool IsLow(const Room &room) const;
    uint64_t Excess(const Room &room) const; // bytes that the oldest records are to give up
    bool HasEnough(const Room &room) const;
    void RefuseToRemoveAll();
    void ReportLowVolume(bool isLow) const;
    bool RemoveRecords();

    std::string root_;
    RetentionRule rule_;
    VolumeStatus volume_;
    std::function<void(const std::string &)> report_;
    Reception reception_;
    WorkingLog log_;
    int64_t since_ = 0; // records of before are too old; 0 without such a rule
};

} // namespace kelo::tool
