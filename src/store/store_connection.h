#pragma once

#include <memory>
#include <string>

#include "common/db_handles.h"
#include "kelosyslog/dbwriter.h"
#include "store/record_table.h"

namespace kelo {

// The open database of a SyslogDBWriter.
class StoreConnection {
public:
    // Opens the database, and creates it where it is missing. Null with the reason as the thread's last
    // failure.
    static std::unique_ptr<StoreConnection> Open(const std::string &dbPath,
                                                 const SyslogDBWriterOptions &options);
    ~StoreConnection();
    StoreConnection(const StoreConnection &) = delete;
    StoreConnection &operator=(const StoreConnection &) = delete;

    // As SyslogDBWriter::Store.
    template <typename Logs>
    int Store(const Logs &logs, SyslogDBWriterCallback alongside, void *context) {
        const size_t good = records_.Set(logs);
        return good == logs.size() ? Run(alongside, context) : Refuse(good);
    }

    DBConnect_tag *Get() const { return connection_.get(); }

private:
    StoreConnection(std::string dbPath, int busyTimeoutMs)
        : dbPath_(std::move(dbPath)), busyTimeoutMs_(busyTimeoutMs) {}
    int Prepare(const SyslogDBWriterOptions &options);
    int Run(SyslogDBWriterCallback alongside, void *context);
    int Refuse(size_t row);
    static int WaitForLock(void *connection, int calls);

    std::string dbPath_;
    int busyTimeoutMs_;
    RecordTable records_;
    DbConnection connection_;
};

} // namespace kelo
