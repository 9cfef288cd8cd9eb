#pragma once

#include "store/block_reader.h"
#include "store/log_import.h"
#include "store/log_store.h"
#include "store/record_batch.h"

namespace kelo::tool {

// Stores records in batches of one transaction each. Between batches the database is not locked, even if the
// input is slow.
class BatchSink : public RecordSink {
public:
    // `store`, `input` and its `reader` must outlive the sink. `source` is the name under which the progress
    // is stored.
    BatchSink(LogStore &store, const BlockReader &input, const LineReader &reader, std::string source);

    void Take(_SYSLOG_LOG_DATA_tag &log) override;
    void LineDone() override;
    // Stores the taken records. Call it when the input pauses or ends.
    void Flush();

private:
    LogStore &store_;
    const BlockReader &input_;
    const LineReader &reader_;
    StoreProgress progress_;
    RecordBatch batch_;
};

} // namespace kelo::tool
