// LogParser::LogAdd on a million lines of 200 bytes, compared with a loop that only looks for the line
// feeds, and the parser that one would write with std::getline and std::istringstream. And the memory that
// the records take, compared with the minimum.

#include <malloc.h>

#include <cstdlib>
#include <cstring>
#include <limits>
#include <sstream>

#include "kelosyslog/logparser.h"
#include "log_text.h"
#include "support/measure.h"

using namespace kelo::bench;

namespace {

constexpr int kLines = 1'000'000;
constexpr int kRounds = 5;

size_t CountLineFeeds(const std::string &text) {
    size_t count = 0;
    const char *end = text.data() + text.size();
    for (const char *next = text.data(); next != end; ++count) {
        const auto *lineFeed =
            static_cast<const char *>(std::memchr(next, '\n', static_cast<size_t>(end - next)));
        next = lineFeed != nullptr ? lineFeed + 1 : end;
    }
    return count;
}

std::list<_SYSLOG_LOG_DATA_tag> StreamParse(const std::string &text) {
    std::list<_SYSLOG_LOG_DATA_tag> logs;
    std::istringstream lines(text);
    std::string line;
    while (std::getline(lines, line)) {
        std::istringstream fields(line);
        _SYSLOG_LOG_DATA_tag log;
        std::string prio;
        fields >> log.fac >> prio >> log.ldate >> log.ltime >> log.utcsec >> log.extnum >> log.tzoffset >>
            log.host >> log.ip >> log.prog >> log.tag;
        log.prio = PriorStrToType(prio.c_str());
        fields.get();
        std::getline(fields, log.msg);
        logs.push_back(std::move(log));
    }
    return logs;
}

// Bytes that the allocator has handed out, its own overhead included.
size_t HeapBytes() {
    const struct mallinfo2 info = mallinfo2();
    return info.uordblks + info.hblkhd;
}

// What a record takes however it is kept: itself, and the texts that do not fit into it.
size_t NecessaryBytes(const _SYSLOG_LOG_DATA_tag &log) {
    size_t bytes = sizeof log;
    for (const std::string *text : {&log.fac, &log.ldate, &log.ltime, &log.tzoffset, &log.host, &log.ip,
                                    &log.prog, &log.tag, &log.msg}) {
        if (text->size() > std::string().capacity())
            bytes += text->size() + 1;
    }
    return bytes;
}

bool CompareMemory(std::string &text) {
    LogParser parser;
    const size_t before = HeapBytes();
    parser.LogAdd(text);
    const size_t taken = HeapBytes() - before;
    size_t necessary = 0;
    for (const _SYSLOG_LOG_DATA_tag &log : parser.LogListTake())
        necessary += NecessaryBytes(log);
    constexpr double kMiB = 1 << 20;
    PrintHeading("Memory of LogAdd", "MiB");
    return PrintRatio("heap after LogAdd", static_cast<double>(taken) / kMiB, "the bare records",
                      static_cast<double>(necessary) / kMiB, 1.3);
}

} // namespace

// bench_logadd [LINES]: fewer lines for a profiler.
int main(int argc, char **argv) {
    const int lines = argc > 1 ? std::atoi(argv[1]) : kLines;
    std::string text = LogText(lines);
    // As in a program that goes on parsing, the memory of one round serves the next; else the kernel's
    // clearing of 600 MiB is what one measures.
    mallopt(M_TRIM_THRESHOLD, std::numeric_limits<int>::max());
    // Freeing what was parsed is no part of parsing.
    const auto logAdd = [&text] {
        LogParser parser;
        return Time([&] { parser.LogAdd(text); });
    };
    const auto streamParse = [&text] {
        std::list<_SYSLOG_LOG_DATA_tag> logs;
        return Time([&] { logs = StreamParse(text); });
    };
    const auto countLines = [&text, lines] {
        return Time([&] {
            if (CountLineFeeds(text) != static_cast<size_t>(lines))
                Fail("wrong number of lines");
        });
    };
    const auto times =
        MedianTimes({{"LogAdd", logAdd}, {"streams", streamParse}, {"line feeds only", countLines}}, kRounds);
    PrintHeading(std::to_string(lines) + " lines of 200 bytes into records", "ms");
    bool allKept = PrintRatio("LogAdd", times[0], "getline and istringstream", times[1], 1.0 / 3);
    allKept = PrintRatio("LogAdd", times[0], "memchr for the line feeds only", times[2], 30) && allKept;
    allKept = CompareMemory(text) && allKept;
    return allKept ? 0 : 1;
}
