#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

#include "kelosyslog/records.h"

namespace kelo::tool {

// Takes the bytes of one file of the message spool apart. docs/receiving.md describes a record:
//
//     1 HOSTID RECEIPT HOSTLEN PROGLEN MSGLEN UTC TZ FAC LEVEL TAG IP HOST PROG MSG\n
//
// In the record of a message that is passed on as it came the lengths of host and program, the three fields
// from FAC on, and HOST and PROG are each one empty field; MSG is the whole message. Before, such a record
// had all fields and a program without a byte.
//
// What is no record is garbage up to where the next one begins: HOSTID, a random number that no sender knows,
// is the same in all records of a file.
class SpoolParser {
public:
    enum class Piece {
        kRecord,  // of Size() bytes
        kGarbage, // Size() bytes of it
        kPartial, // the beginning of a record or of garbage
        kForeign  // a record of another version of this program
    };

    static constexpr size_t kMaxRecordBytes = 512 * 1024;

    SpoolParser() = default;
    SpoolParser(const SpoolParser &) = delete;
    SpoolParser &operator=(const SpoolParser &) = delete;

    // Looks at what `bytes`, which are not empty, begin with; a record goes into `log`.
    Piece Parse(std::string_view bytes, _SYSLOG_LOG_DATA_tag &log);

    size_t Size() const { return size_; }
    // The number that syslog-ng gave the message when it came; 0 when unknown.
    uint64_t Receipt() const { return receipt_; }

private:
    struct Header;
    Piece ParseRecord(std::string_view bytes, _SYSLOG_LOG_DATA_tag &log);
    Piece Skip(std::string_view bytes);
    size_t FindStart(std::string_view bytes, size_t from) const;
    size_t FindMark(std::string_view bytes, size_t from) const;
    bool SetTime(_SYSLOG_LOG_DATA_tag &log, int64_t utc, std::string_view zone);

    std::string mark_; // what every record of the file begins with, once one is known
    std::optional<std::boyer_moore_horspool_searcher<const char *>> markSearcher_; // points to the mark
    size_t size_ = 0;
    uint64_t receipt_ = 0;
    // Of the last record: most have the same second.
    int64_t utc_ = INT64_MIN;
    std::string zone_;
    std::string date_;
    std::string time_;
};

} // namespace kelo::tool
