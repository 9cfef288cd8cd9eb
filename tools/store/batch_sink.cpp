#include "store/batch_sink.h"

#include <algorithm>

namespace kelo::tool {

BatchSink::BatchSink(LogStore &store, const BlockReader &input, const LineReader &reader, std::string source)
    : store_(store), input_(input), reader_(reader) {
    progress_.source = std::move(source);
    progress_.offset = reader.EndOffset();
}

void BatchSink::Take(_SYSLOG_LOG_DATA_tag &log) {
    batch_.Take(log);
}

void BatchSink::LineDone() {
    if (batch_.IsFull())
        Flush();
}

void BatchSink::Flush() {
    if (reader_.EndOffset() == progress_.offset)
        return;
    progress_.offset = reader_.EndOffset();
    progress_.lines = reader_.Number();
    progress_.head = input_.Head().substr(0, std::min<uint64_t>(progress_.offset, BlockReader::kHeadBytes));
    store_.Store(batch_.Records(), progress_);
    batch_.Clear();
}

} // namespace kelo::tool
