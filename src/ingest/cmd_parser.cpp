#include "kelosyslog/cmdparser.h"

// Json::Reader is deprecated in favour of CharReader, which by default treats comments and repeated keys
// differently and has other error texts. This reader defines the format of commands.
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

#include <json/reader.h>
#include <syslog.h>

#include "common/failure.h"

namespace {

void ReportFailure(KELOFAILUREKIND kind, const char *reason) {
    kelo::Fail(kind, "", "CmdParse", reason);
    syslog(LOG_ERR, "Error: parsing error, reason = %s\n", reason);
}

bool ParsePiece(Json::Reader &reader, const char *begin, const char *end,
                std::vector<Json::Value> &commands) {
    Json::Value command;
    if (!reader.parse(begin, end, command, true)) {
        ReportFailure(KELO_FAILURE_FORMAT, reader.getFormattedErrorMessages().c_str());
        return false;
    }
    commands.push_back(std::move(command));
    return true;
}

} // namespace

CmdParser::CmdParser() = default;
CmdParser::~CmdParser() = default;

bool CmdParser::CmdParse(std::string &text, std::vector<Json::Value> &commands) try {
    Json::Reader reader;
    size_t start = 0;
    while (start < text.size()) {
        const size_t brace = text.find('}', start);
        const size_t end = brace == std::string::npos ? text.size() : brace + 1;
        if (brace != start && !ParsePiece(reader, text.data() + start, text.data() + end, commands))
            return false;
        start = end;
    }
    return true;
} catch (const std::bad_alloc &error) {
    ReportFailure(KELO_FAILURE_MEMORY, error.what());
    return false;
} catch (const std::exception &error) {
    ReportFailure(KELO_FAILURE_FORMAT, error.what()); // nested too deep
    return false;
}
