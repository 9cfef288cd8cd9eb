#include "store/record_batch.h"

#include <utility>

namespace kelo::tool {

_SYSLOG_LOG_DATA_tag &RecordBatch::Next() {
    if (rows_ == records_.size())
        records_.emplace_back();
    return records_[rows_];
}

void RecordBatch::Take(_SYSLOG_LOG_DATA_tag &log) {
    const size_t textBytes = log.fac.size() + log.ldate.size() + log.ltime.size() + log.tzoffset.size() +
                             log.host.size() + log.ip.size() + log.prog.size() + log.tag.size() +
                             log.msg.size();
    if (&Next() != &log)
        std::swap(Next(), log);
    ++rows_;
    bytes_ += textBytes;
    hasLongText_ = hasLongText_ || textBytes > kLongTextBytes;
}

void RecordBatch::Clear() {
    if (hasLongText_)
        records_ = {};
    rows_ = 0;
    bytes_ = 0;
    hasLongText_ = false;
}

} // namespace kelo::tool
