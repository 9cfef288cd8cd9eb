#include "store/record_batch.h"

#include <utility>

namespace kelo::tool {

void RecordBatch::Take(_SYSLOG_LOG_DATA_tag &log) {
    const size_t textBytes = log.fac.size() + log.ldate.size() + log.ltime.size() + log.tzoffset.size() +
                             log.host.size() + log.ip.size() + log.prog.size() + log.tag.size() +
                             log.msg.size();
    if (rows_ == records_.size())
        records_.emplace_back();
    std::swap(records_[rows_++], log);
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
