#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <string>

#include "kelosyslog/logparser.h"
#include "store/line_reader.h"

namespace kelo::tool {

// The destination of the records of an import.
class RecordSink {
public:
    virtual ~RecordSink() = default;

    // Takes a record, and may leave the content of another in `log`.
    virtual void Take(_SYSLOG_LOG_DATA_tag &log) = 0;

    // A line has been processed, with or without a record.
    virtual void LineDone() {}
};

// The results of the lines of an import. Empty lines are ignored.
struct ImportCounts {
    uint64_t parsed = 0;
    uint64_t tooFewFields = 0;
    uint64_t overlong = 0;
    std::map<std::string, uint64_t> incomplete; // parsed, by the first mandatory field that is empty
};

// Converts the lines of an input to records as LogParser does, but with a result for every line.
class LogImport {
public:
    // Called for the reader's current line if it was rejected or is incomplete, with the reason.
    using LineReport = std::function<void(const LineReader &reader, const std::string &reason)>;

    // With `skipIncomplete`, records with an empty mandatory field do not reach the sink.
    LogImport(LineReport report, bool skipIncomplete)
        : report_(std::move(report)), skipIncomplete_(skipIncomplete) {}

    // Imports the lines that the reader has. Throws what the sink throws.
    void Run(LineReader &reader, RecordSink &sink);

    const ImportCounts &Counts() const { return counts_; }

private:
    void ImportLine(const LineReader &reader, RecordSink &sink);
    void Reject(const LineReader &reader);

    LineReport report_;
    bool skipIncomplete_;
    ImportCounts counts_;
    LogParser parser_;
    // Reused for every line, with their memory.
    std::string line_;
    _SYSLOG_LOG_DATA_tag log_;
};

} // namespace kelo::tool
