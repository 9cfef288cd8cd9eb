#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <string>

#include "kelosyslog/logparser.h"
#include "line_reader.h"

namespace kelo::tool {

// Where the records of an import go.
class RecordSink {
public:
    virtual ~RecordSink() = default;

    // Takes a record, and may leave another's contents in `log`.
    virtual void Take(_SYSLOG_LOG_DATA_tag &log) = 0;

    // A line has been dealt with, up to which `reader` has been read. Called for lines without a record too.
    virtual void LineDone(const LineReader &reader) = 0;

    // The input pauses or ends: nothing that was taken may wait any longer.
    virtual void Flush(const LineReader &reader) = 0;
};

// What became of the lines of an import. Empty lines are no lines.
struct ImportCounts {
    uint64_t parsed = 0;
    uint64_t tooFewFields = 0;
    uint64_t overlong = 0;
    std::map<std::string, uint64_t> incomplete; // parsed, by the first mandatory field that is empty
};

// Turns the lines of an input into records: as LogParser does, but with an account of every line.
class LogImport {
public:
    // Told of a line that was rejected, or that is incomplete, and why.
    using LineReport = std::function<void(uint64_t line, const std::string &reason)>;

    // Both must outlive the import. With `skipIncomplete`, records with an empty mandatory field do not reach
    // the sink.
    LogImport(RecordSink &sink, LineReport report, bool skipIncomplete)
        : sink_(sink), report_(std::move(report)), skipIncomplete_(skipIncomplete) {}

    // Imports all lines of one input. Throws what the reader and the sink throw.
    void Run(LineReader &reader);

    const ImportCounts &Counts() const { return counts_; }

private:
    void ImportLine(const LineReader &reader);
    void Reject(uint64_t line);

    RecordSink &sink_;
    LineReport report_;
    bool skipIncomplete_;
    ImportCounts counts_;
    LogParser parser_;
    // Used again for every line, so that their memory is.
    std::string line_;
    _SYSLOG_LOG_DATA_tag log_;
};

} // namespace kelo::tool
