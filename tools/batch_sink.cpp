#include "batch_sink.h"

#include <algorithm>

namespace kelo::tool {

BatchSink::BatchSink(LogStore &store, std::string source) : store_(store), batch_(kBatchRows) {
    progress_.source = std::move(source);
}

void BatchSink::Take(_SYSLOG_LOG_DATA_tag &log) {
    std::swap(batch_[rows_++], log);
}

void BatchSink::LineDone(const LineReader &reader) {
    hasLongLine_ = hasLongLine_ || reader.Line().size() > kLongLineBytes;
    if (rows_ == kBatchRows || reader.EndOffset() - progress_.offset >= kBatchBytes)
        Flush(reader);
}

void BatchSink::Flush(const LineReader &reader) {
    if (reader.EndOffset() == progress_.offset)
        return;
    progress_.offset = reader.EndOffset();
    progress_.lines = reader.Number();
    progress_.head = reader.Head().substr(0, std::min<uint64_t>(progress_.offset, LineReader::kHeadBytes));
    store_.Store({batch_.data(), rows_}, progress_);
    // The memory of the records serves the next batch, but that of long lines must not pile up in it.
    if (hasLongLine_)
        batch_ = std::vector<_SYSLOG_LOG_DATA_tag>(kBatchRows);
    rows_ = 0;
    hasLongLine_ = false;
}

} // namespace kelo::tool
