#pragma once

// Conversion of log text to records.
//
// One entry is one line: eleven fields, each a sequence of bytes other than the blank (0x20), separated by
// one or more blanks, and the message, which follows unchanged after exactly one blank:
//
//     local0 info 2020/01/02 10:11:12 1577931072 200 +08:00 nas 127.0.0.1 prog tag the message
//     fac    prio ldate      ltime    utcsec  extnum tzoffset host ip     prog tag msg
//
// Only the blank is a separator: tabs, carriage returns, NUL bytes and invalid UTF-8 are ordinary text. An
// unknown severity word is read as "debug"; the two numbers are read as strtoll() reads them.
//
//     LogParser parser;
//     parser.LogAdd(text);
//     for (const _SYSLOG_LOG_DATA_tag &log : parser.LogListTake())
//         if (parser.isValidLog(log))
//             Store(log);
//
// Threads: a parser, with the stream that feeds it, is used by one thread at a time. Out of memory is
// reported as std::bad_alloc; what was parsed before stays.

#include <cstddef>
#include <cstdint>
#include <list>
#include <string>
#include <string_view>

#include "kelosyslog/export.h"
#include "kelosyslog/records.h"

class KELOSYSLOG_API LogParser {
public:
    LogParser();
    ~LogParser();
    LogParser(const LogParser &) = default;
    LogParser &operator=(const LogParser &) = default;

    // Parses every line of `text` and appends the records to the list, complete or not. A line with fewer
    // than eleven fields is reported in the system log and skipped; empty lines are ignored. The last line
    // needs no line feed. A fragment that was set (PartialLogSet) is first prefixed to `text`, in the
    // caller's string. Always returns 0.
    uint32_t LogAdd(std::string &text);

    // Parses one line, without its line feed, into `record`. Fields other than the twelve are not touched.
    // Returns 0, or -1 when the line has fewer than eleven fields, which leaves those it has in `record`.
    int32_t ParseSingleEntry(const std::string &line, _SYSLOG_LOG_DATA_tag &record) const;

    // Splits `text` at every character of `delimiters` and drops empty pieces. (The free function Tokenize
    // keeps them.)
    std::list<std::string> Tokenize(const std::string &text, const std::string &delimiters) const;

    // Returns 1 when host, ip, ldate, ltime, prog and msg are all non-empty. Otherwise reports it in the
    // system log, keeps a copy of the record for PartialLogDump and returns 0. The copies stay until
    // RejectedClear.
    int32_t isValidLog(const _SYSLOG_LOG_DATA_tag &record);

    // Discards the records that isValidLog has kept. A program that reads forever calls it from time to time.
    // Returns how many there were.
    size_t RejectedClear();

    // Number of records in the list, and a copy of the list in the order of the input.
    int32_t LogGetCount() const;
    std::list<_SYSLOG_LOG_DATA_tag> LogListGet() const;

    // Empties the list. The fragment and the rejected records stay. Returns 0.
    int32_t LogReset();

    // Write the list, and the records that isValidLog rejected, to the debug channel at level 2, which is
    // silent unless the program raised the threshold (Debuger::ThresholdSet).
    void LogDump() const;
    void PartialLogDump() const;

    // Sets the text that every following LogAdd prefixes to its input; "" (as at the start) for none.
    void PartialLogSet(std::string fragment);

    // LogListGet and LogReset in one, without the copy.
    std::list<_SYSLOG_LOG_DATA_tag> LogListTake();

private:
    std::string partialLog_;
    std::list<_SYSLOG_LOG_DATA_tag> partialLogList_;
    std::list<_SYSLOG_LOG_DATA_tag> logList_;
};

// Feeds a parser from a stream in pieces of any size: an unterminated last line waits for its
// rest. The records are the same as if the whole stream had been added in one LogAdd.
//
//     char buffer[65536];
//     LogStream stream(parser);
//     while (const size_t length = std::fread(buffer, 1, sizeof buffer, input))
//         stream.Add({buffer, length});
//     if (std::ferror(input) == 0) // else the line that waits may be cut
//         stream.Finish();
//
// The parser's fragment belongs to the stream while it is in use. Memory stays bounded by the longest line
// allowed: a longer one is dropped as a whole, reported in the system log like one that does not parse, and
// counted.
class KELOSYSLOG_API LogStream {
public:
    static constexpr size_t kMaxLineBytes = 16 * 1024 * 1024;

    // `parser` must outlive the stream. `maxLineBytes` does not include the line feed.
    explicit LogStream(LogParser &parser, size_t maxLineBytes = kMaxLineBytes);

    // Parses the lines that `piece` completes and keeps the rest. Do not use the stream after std::bad_alloc.
    void Add(std::string_view piece);

    // Ends the stream: parses the waiting line, if there is one. The stream may then be used again.
    void Finish();

    // Bytes of the stream whose lines the parser has got, or that were dropped with an overlong line: where
    // to go on reading after a restart. The line that waits for its rest is not among them.
    uint64_t TakenBytes() const;

    // Lines dropped because of their length.
    uint64_t OverlongCount() const;

private:
    void TakePart(std::string_view piece);
    void ParseLines(std::string_view lines);
    void Keep(std::string_view part);

    LogParser &parser_;
    size_t maxLineBytes_;
    std::string waiting_;
    bool isSkipping_ = false; // within an overlong line
    uint64_t overlongCount_ = 0;
    uint64_t addedBytes_ = 0;
    uint64_t openLineBytes_ = 0; // since the last line feed
};
