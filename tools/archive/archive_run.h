#pragma once

#include <cstdint>
#include <functional>
#include <string>

#include "archive/archive_folder.h"
#include "kelosyslog/logger.h"

namespace kelo::tool {

// "1 log", "5 logs of nas1".
std::string LogsOf(uint64_t count, const std::string &host);

// One run of "kelosyslog archive": copies a database, records that in the server's event log, and removes the
// copied records if requested.
class ArchiveRun {
public:
    struct Order {
        std::string source; // absolute path
        std::string host;   // only its records; "" for all
        bool isRemoving;
        std::string root; // of the server's event log
    };
    // `report` gets lines about the results.
    ArchiveRun(Order order, ArchiveFolder &folder, std::function<void(const std::string &)> report);

    // Returns whether there was anything to do. Throws DatabaseError, OutputError and Interrupted; an event
    // that cannot be written is only a warning.
    bool Run();

    // Name of the created archive; "" for none.
    const std::string &Made() const { return made_; }

private:
    bool Archive();
    void Record(int (Logger::*add)(std::string) const) const;
    void Copy();
    bool ResumeRemovals();
    uint64_t RemoveArchived(const std::string &name);

    Order order_;
    ArchiveFolder &folder_;
    std::function<void(const std::string &)> report_;
    std::string made_;
};

} // namespace kelo::tool
