#include "batch_sink.h"

#include <algorithm>

namespace kelo::tool {

BatchSink::BatchSink(LogStore &store, const LineReader &reader, std::string source)
    : store_(store), reader_(reader), batch_(kBatchRows) {
    progress_.source = std::move(source);
    progress_.offset = reader.EndOffset();
}

void BatchSink::Take(_SYSLOG_LOG_DATA_tag &log) {
    std::swap(batch_[rows_++], log);
}

void BatchSink::LineDone() {
    hasLongLine_ = hasLongLine_ || reader_.Line().size() > kLongLineBytes;
    if (rows_ == kBatchRows || reader_.EndOffset() - progress_.offset >= kBatchBytes)
        Flush();
}

void BatchSink::Flush() {
    if (reader_.EndOffset() == progress_.offset)
        return;
    progress_.offset = reader_.EndOffset();
    progress_.lines = reader_.Number();
    progress_.head = reader_.Head().substr(0, std::min<uint64_t>(progress_.offset, LineReader::kHeadBytes));
    store_.Store({batch_.data(), rows_}, progress_);
    // The memory of the records serves the next batch, but that of long lines must not pile up in it.
    if (hasLongLine_)
        batch_ = std::vector<_SYSLOG_LOG_DATA_tag>(kBatchRows);
    rows_ = 0;
    hasLongLine_ = false;
}

} // namespace kelo::tool
