// Any text parses the same in one piece, in pieces cut anywhere, and line by line.

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <tuple>

#include "kelosyslog/logparser.h"
#include "quiet.h"

namespace {

using Logs = std::list<_SYSLOG_LOG_DATA_tag>;

auto Fields(const _SYSLOG_LOG_DATA_tag &log) {
    return std::tie(log.fac, log.prio, log.ldate, log.ltime, log.utcsec, log.extnum, log.tzoffset, log.host,
                    log.ip, log.prog, log.tag, log.msg);
}

void RequireSame(const Logs &left, const Logs &right, const char *what) {
    const auto same = [](const auto &one, const auto &other) { return Fields(one) == Fields(other); };
    if (std::equal(left.begin(), left.end(), right.begin(), right.end(), same))
        return;
    Fail("other records", what);
}

Logs ParseLines(const std::string &text) {
    LogParser parser;
    Logs logs;
    for (const std::string &line : parser.Tokenize(text, "\n")) {
        _SYSLOG_LOG_DATA_tag log;
        if (parser.ParseSingleEntry(line, log) == 0)
            logs.push_back(log);
    }
    return logs;
}

Logs ParsePieces(const std::string &text, size_t length) {
    LogParser parser;
    LogStream stream(parser);
    for (size_t start = 0; start < text.size(); start += length)
        stream.Add(std::string_view(text).substr(start, length));
    stream.Finish();
    return parser.LogListTake();
}

} // namespace

// The first byte says how long the pieces are.
extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    if (size == 0)
        return 0;
    std::string text(reinterpret_cast<const char *>(data) + 1, size - 1);
    LogParser parser;
    parser.LogAdd(text);
    const Logs logs = parser.LogListGet();
    RequireSame(logs, ParseLines(text), "line by line");
    RequireSame(logs, ParsePieces(text, size_t{data[0]} + 1), "in pieces");
    return 0;
}
