#include "store/log_import.h"

namespace kelo::tool {
namespace {

// The first field that makes a record incomplete, in the order of LogParser::isValidLog; null for none. (That
// one also reports to the system log and keeps a copy, of which an import may have millions.)
const char *FirstEmptyField(const _SYSLOG_LOG_DATA_tag &log) {
    const struct {
        const char *name;
        const std::string &text;
    } kMandatory[] = {{"host", log.host},   {"ip", log.ip},     {"ldate", log.ldate},
                      {"ltime", log.ltime}, {"prog", log.prog}, {"msg", log.msg}};
    for (const auto &[name, text] : kMandatory) {
        if (text.empty())
            return name;
    }
    return nullptr;
}

} // namespace

void LogImport::Run(LineReader &reader, RecordSink &sink) {
    while (reader.Next()) {
        if (reader.IsOverlong()) {
            ++counts_.overlong;
            report_(reader, "rejected: too long");
        } else if (!reader.Line().empty()) {
            ImportLine(reader, sink);
        }
        sink.LineDone();
    }
}

void LogImport::ImportLine(const LineReader &reader, RecordSink &sink) {
    line_.assign(reader.Line());
    if (parser_.ParseSingleEntry(line_, log_) != 0) {
        Reject(reader);
        return;
    }
    ++counts_.parsed;
    if (const char *field = FirstEmptyField(log_)) {
        ++counts_.incomplete[field];
        report_(reader, std::string("incomplete: ") + field + " is empty");
        if (skipIncomplete_)
            return;
    }
    sink.Take(log_);
}

void LogImport::Reject(const LineReader &reader) {
    ++counts_.tooFewFields;
    report_(reader, "rejected: " + std::to_string(parser_.Tokenize(line_, " ").size()) + " of 11 fields");
}

} // namespace kelo::tool
