#pragma once

#include "store/log_import.h"
#include "store/log_store.h"
#include "store/record_batch.h"

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
    LogStore &store_;
    const LineReader &reader_;
    StoreProgress progress_;
    RecordBatch batch_;
};

} // namespace kelo::tool
