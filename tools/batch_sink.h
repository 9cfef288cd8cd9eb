#pragma once

#include <vector>

#include "log_import.h"
#include "log_store.h"

namespace kelo::tool {

// Stores records in batches of one transaction each. Between batches the database is not locked, however
// slowly the input comes.
class BatchSink : public RecordSink {
public:
    // `store` and `reader`, whose records come, must outlive the sink. `source` is the name that the progress
    // is stored under.
    BatchSink(LogStore &store, const LineReader &reader, std::string source);

    void Take(_SYSLOG_LOG_DATA_tag &log) override;
    void LineDone() override;
    void Flush() override;

private:
    static constexpr size_t kBatchRows = 5000;
    static constexpr uint64_t kBatchBytes = 4 * 1024 * 1024; // of the input
    static constexpr size_t kLongLineBytes = 8 * 1024;

    LogStore &store_;
    const LineReader &reader_;
    StoreProgress progress_;
    std::vector<_SYSLOG_LOG_DATA_tag> batch_;
    size_t rows_ = 0; // of the batch; what lies behind waits for use
    bool hasLongLine_ = false;
};

} // namespace kelo::tool
