#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "kelosyslog/records.h"

namespace kelo::tool {

// Records that are stored together. The next batch reuses their memory, except that of long texts, which
// would accumulate.
class RecordBatch {
public:
    // From this size on a batch is stored.
    static constexpr size_t kFullRows = 5000;
    static constexpr size_t kFullBytesPerRow = 840; // 4 MiB as a rule

    explicit RecordBatch(size_t fullRows = kFullRows) : fullRows_(fullRows) {}

    // A record outside the batch, to be filled and then taken without a copy. Valid until the next call.
    _SYSLOG_LOG_DATA_tag &Next();

    // Takes the record, and may leave the content of another in `log`.
    void Take(_SYSLOG_LOG_DATA_tag &log);

    std::span<const _SYSLOG_LOG_DATA_tag> Records() const { return {records_.data(), rows_}; }
    size_t Size() const { return rows_; }
    bool IsFull() const { return rows_ >= fullRows_ || bytes_ >= fullRows_ * kFullBytesPerRow; }

    void Clear();

private:
    static constexpr size_t kLongTextBytes = 8 * 1024;

    size_t fullRows_;
    std::vector<_SYSLOG_LOG_DATA_tag> records_;
    size_t rows_ = 0; // of the batch; the others are free for use
    size_t bytes_ = 0;
    bool hasLongText_ = false;
};

} // namespace kelo::tool
