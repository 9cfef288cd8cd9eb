#include "ingest/log_entry.h"

#include <charconv>
#include <cstring>
#include <limits>

namespace kelo {
namespace {

bool IsDigit(char byte) {
    return byte >= '0' && byte <= '9';
}

// White space as strtoll() skips it. A field may begin with it, because only the blank separates fields.
bool IsWhiteSpace(char byte) {
    return byte == ' ' || (byte >= '\t' && byte <= '\r');
}

// strtoll() with base 10 on bytes without a terminator: the number saturates, and other text gives 0.
int64_t ToNumber(std::string_view text) {
    const char *begin = text.data();
    const char *const end = begin + text.size();
    while (begin != end && IsWhiteSpace(*begin))
        ++begin;
    if (begin != end && *begin == '+') {
        ++begin;
        if (begin == end || !IsDigit(*begin))
            return 0;
    }
    int64_t number = 0;
    if (std::from_chars(begin, end, number).ec == std::errc::result_out_of_range) {
        using Limits = std::numeric_limits<int64_t>;
        return *begin == '-' ? Limits::min() : Limits::max();
    }
    return number;
}

_SYSLOG_DB_PRIORITY_tag ToSeverity(std::string_view text) {
    char word[16] = {}; // longer than any severity word: a longer text equals none of them
    std::memcpy(word, text.data(), std::min(text.size(), sizeof word - 1));
    return PriorStrToType(word);
}

// The fields of one line, taken from left to right.
class FieldReader {
public:
    explicit FieldReader(std::string_view line) : next_(line.data()), end_(next_ + line.size()) {}

    // Takes the next field and the one blank behind it. Returns false at the end of the line.
    bool Take(std::string_view &field) {
        while (next_ != end_ && *next_ == ' ')
            ++next_;
        if (next_ == end_)
            return false;
        const auto left = static_cast<size_t>(end_ - next_);
        const auto *blank = static_cast<const char *>(std::memchr(next_, ' ', left));
        const char *fieldEnd = blank != nullptr ? blank : end_;
        field = {next_, static_cast<size_t>(fieldEnd - next_)};
        next_ = blank != nullptr ? blank + 1 : end_;
        return true;
    }

    bool TakeText(std::string &text) {
        std::string_view field;
        if (!Take(field))
            return false;
        text.assign(field);
        return true;
    }

    std::string_view Rest() const { return {next_, static_cast<size_t>(end_ - next_)}; }

private:
    const char *next_;
    const char *end_;
};

bool TakeSeverity(FieldReader &fields, _SYSLOG_DB_PRIORITY_tag &severity) {
    std::string_view field;
    if (!fields.Take(field))
        return false;
    severity = ToSeverity(field);
    return true;
}

bool TakeNumber(FieldReader &fields, int64_t &number) {
    std::string_view field;
    if (!fields.Take(field))
        return false;
    number = ToNumber(field);
    return true;
}

} // namespace

bool ParseLogEntry(std::string_view line, _SYSLOG_LOG_DATA_tag &record) {
    FieldReader fields(line);
    const bool complete = fields.TakeText(record.fac) && TakeSeverity(fields, record.prio) &&
                          fields.TakeText(record.ldate) && fields.TakeText(record.ltime) &&
                          TakeNumber(fields, record.utcsec) && TakeNumber(fields, record.extnum) &&
                          fields.TakeText(record.tzoffset) && fields.TakeText(record.host) &&
                          fields.TakeText(record.ip) && fields.TakeText(record.prog) &&
                          fields.TakeText(record.tag);
    if (complete)
        record.msg.assign(fields.Rest());
    return complete;
}

} // namespace kelo
