#include "kelosyslog/logparser.h"

#include <utility>

#include "common/failure.h"
#include "ingest/lines.h"
#include "ingest/log_entry.h"
#include "kelosyslog/debuger.h"

namespace {

constexpr char kFewFields[] = "the line has fewer than eleven fields";

} // namespace

LogParser::LogParser() = default;
LogParser::~LogParser() = default;

uint32_t LogParser::LogAdd(std::string &text) {
    if (!partialLog_.empty()) {
        if (Debuger::ThresholdGet() >= 2)
            Debuger::MSG(2, "Paritial log compensation: " + partialLog_ + " " + text);
        text.insert(0, partialLog_);
    }
    kelo::ForEachLine(text, [this](std::string_view line) {
        // Filled in a list of its own, so that the record is never moved, and is discarded if memory runs
        // out.
        std::list<_SYSLOG_LOG_DATA_tag> entry(1);
        if (kelo::ParseLogEntry(line, entry.front())) {
            logList_.splice(logList_.end(), entry);
        } else {
            kelo::Fail(KELO_FAILURE_FORMAT, "", line, kFewFields);
            Debuger::MSG(0, "Fail to parse log");
        }
    });
    return 0;
}

int32_t LogParser::ParseSingleEntry(const std::string &line, _SYSLOG_LOG_DATA_tag &record) const {
    return kelo::ParseLogEntry(line, record) ? 0 : kelo::Fail(KELO_FAILURE_FORMAT, "", line, kFewFields);
}

std::list<std::string> LogParser::Tokenize(const std::string &text, const std::string &delimiters) const {
    std::list<std::string> pieces;
    size_t start = text.find_first_not_of(delimiters);
    while (start != std::string::npos) {
        const size_t end = text.find_first_of(delimiters, start);
        pieces.emplace_back(text, start, end - start);
        start = text.find_first_not_of(delimiters, end);
    }
    return pieces;
}

int32_t LogParser::isValidLog(const _SYSLOG_LOG_DATA_tag &record) {
    for (const std::string *field :
         {&record.host, &record.ip, &record.ldate, &record.ltime, &record.prog, &record.msg}) {
        if (field->empty()) {
            Debuger::MSG(0, "Invalid log!!!!!!!!!!!!! (Attention Please)");
            kelo::Fail(KELO_FAILURE_FORMAT, "", record.msg, "host, ip, ldate, ltime, prog or msg is empty");
            partialLogList_.push_back(record);
            return 0;
        }
    }
    return 1;
}

size_t LogParser::RejectedClear() {
    return std::exchange(partialLogList_, {}).size();
}

int32_t LogParser::LogGetCount() const {
    return static_cast<int32_t>(logList_.size());
}

std::list<_SYSLOG_LOG_DATA_tag> LogParser::LogListGet() const {
    return logList_;
}

int32_t LogParser::LogReset() {
    logList_.clear();
    return 0;
}

void LogParser::PartialLogSet(std::string fragment) {
    partialLog_ = std::move(fragment);
}

std::list<_SYSLOG_LOG_DATA_tag> LogParser::LogListTake() {
    return std::exchange(logList_, {});
}
