// LogParser::LogAdd on a million lines of 200 bytes, beside two peers: a loop that only looks for the line
// feeds, and the parser that one would write with std::getline and std::istringstream. And the memory that
// the records take, beside what they must take.

#include <malloc.h>

#include <cstring>
#include <sstream>

#include "kelosyslog/logparser.h"
#include "log_text.h"
#include "stopwatch.h"

using namespace kelo::bench;

namespace {

constexpr int kLines = 1'000'000;

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

void CompareMemory(std::string &text) {
    LogParser parser;
    const size_t before = HeapBytes();
    parser.LogAdd(text);
    const size_t taken = HeapBytes() - before;
    size_t necessary = 0;
    for (const _SYSLOG_LOG_DATA_tag &log : parser.LogListTake())
        necessary += NecessaryBytes(log);
    std::printf("memory of LogAdd / of the bare records   %6.2f   (%zu / %zu MiB, at most 1.3)\n",
                static_cast<double>(taken) / static_cast<double>(necessary), taken >> 20, necessary >> 20);
}

} // namespace

int main() {
    std::string text = LogText(kLines);
    const double memchrMs = BestOf(5, [&] { Keep(CountLineFeeds(text)); });
    double logAddMs = 0;
    double streamMs = 0;
    // Freeing what was parsed is no part of parsing.
    for (int run = 0; run < 5; ++run) {
        LogParser parser;
        logAddMs = Best(logAddMs, ElapsedMs([&] { parser.LogAdd(text); }));
        std::list<_SYSLOG_LOG_DATA_tag> logs;
        streamMs = Best(streamMs, ElapsedMs([&] { logs = StreamParse(text); }));
    }
    std::printf(
        "%d lines of 200 bytes: memchr only %.0f ms, LogAdd %.0f ms, getline and istringstream %.0f ms\n",
        kLines, memchrMs, logAddMs, streamMs);
    std::printf("time of LogAdd / of memchr only          %6.2f\n", logAddMs / memchrMs);
    std::printf("time of the stream parser / of LogAdd    %6.2f   (at least 3)\n", streamMs / logAddMs);
    CompareMemory(text);
}
