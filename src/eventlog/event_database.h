#pragma once

#include <string>
#include <utility>

#include "common/root.h"
#include "kelosyslog/dbhandler.h"

namespace kelo {

// Path of the server's own event database.
inline std::string ServerEventDatabase() {
    return RootedPath("/usr/kelo/etc/kelosyslog.db");
}

// A handler of an event database that disconnects when it goes out of scope.
class EventDatabase {
public:
    explicit EventDatabase(std::string dbPath)
        : handler_(std::move(dbPath), RootedPath("/usr/kelo/syslog/schema/kelosyslog.sql")) {}
    ~EventDatabase() { handler_.DBDiscon(); }
    EventDatabase(const EventDatabase &) = delete;
    EventDatabase &operator=(const EventDatabase &) = delete;

    // Connects, creating a missing database; a failure is reported.
    bool Connect();

    DBHandler *operator->() { return &handler_; }
    DBHandler &operator*() { return handler_; }

private:
    DBHandler handler_;
};

} // namespace kelo
