#include "receive/raw_message.h"

#include <array>
#include <charconv>

namespace kelo::tool {
namespace {

// Numbers of the other facilities are not of the common form.
constexpr std::array<std::string_view, 24> kFacilities = {
    "kern",   "user",   "mail",     "daemon", "auth",   "syslog", "lpr",    "news",
    "uucp",   "cron",   "authpriv", "ftp",    "",       "",       "",       "",
    "local0", "local1", "local2",   "local3", "local4", "local5", "local6", "local7"};

constexpr size_t kOldTimeBytes = std::string_view("Jan  1 00:00:00 ").size();

struct Parts {
    std::string_view host;
    std::string_view prog;
    std::string_view msg;
};

// The text up to `end`, which is removed with it.
bool TakeUpTo(std::string_view &rest, char end, std::string_view &part) {
    const size_t at = rest.find(end);
    if (at == std::string_view::npos)
        return false;
    part = rest.substr(0, at);
    rest.remove_prefix(at + 1);
    return true;
}

// TIME HOST PROG[PID]: MSG
bool ParseOld(std::string_view rest, Parts &parts) {
    if (rest.size() < kOldTimeBytes)
        return false;
    rest.remove_prefix(kOldTimeBytes);
    if (!TakeUpTo(rest, ' ', parts.host))
        return false;
    const size_t end = rest.find_first_of("[: ");
    if (end == std::string_view::npos || rest[end] == ' ')
        return false;
    parts.prog = rest.substr(0, end);
    const size_t colon = rest.find(": ", end);
    if (colon == std::string_view::npos)
        return false;
    parts.msg = rest.substr(colon + 2);
    return true;
}

// 1 TIME HOST PROG PID ID - MSG
bool ParseNew(std::string_view rest, Parts &parts) {
    std::string_view skipped;
    const bool isSplit = TakeUpTo(rest, ' ', skipped) && TakeUpTo(rest, ' ', skipped) &&
                         TakeUpTo(rest, ' ', parts.host) && TakeUpTo(rest, ' ', parts.prog) &&
                         TakeUpTo(rest, ' ', skipped) && TakeUpTo(rest, ' ', skipped);
    if (!isSplit || !rest.starts_with("- "))
        return false;
    parts.msg = rest.substr(2);
    return true;
}

// The rewrite rule r_kelo_raw: NUL becomes visible.
void SetText(std::string &text, std::string_view bytes) {
    if (bytes.find('\0') == std::string_view::npos) {
        text = bytes;
        return;
    }
    text.clear();
    for (const char byte : bytes) {
        if (byte == '\0')
            text += "\\x00";
        else
            text += byte;
    }
}

} // namespace

bool ParseRawMessage(std::string_view message, _SYSLOG_LOG_DATA_tag &log) {
    unsigned number = 0;
    const char *const end = message.data() + message.size();
    if (!message.starts_with('<'))
        return false;
    const auto [after, error] = std::from_chars(message.data() + 1, end, number);
    if (error != std::errc() || after == end || *after != '>' || number / 8 >= kFacilities.size() ||
        kFacilities[number / 8].empty())
        return false;
    const std::string_view rest = message.substr(static_cast<size_t>(after + 1 - message.data()));
    Parts parts;
    if (rest.starts_with("1 ") ? !ParseNew(rest, parts) : !ParseOld(rest, parts))
        return false;
    constexpr char kDigits[] = "0123456789abcdef";
    const char tag[] = {kDigits[number / 16], kDigits[number % 16]};
    log.fac = kFacilities[number / 8];
    log.prio = static_cast<_SYSLOG_DB_PRIORITY_tag>(number % 8);
    log.tag.assign(tag, sizeof tag);
    log.host = parts.host;
    log.prog = parts.prog;
    SetText(log.msg, parts.msg);
    return true;
}

} // namespace kelo::tool
