#pragma once

#include <list>
#include <ostream>
#include <random>
#include <string>
#include <tuple>

#include "kelosyslog/records.h"

// Everything that an entry of log text sets.
inline auto EntryFields(const _SYSLOG_LOG_DATA_tag &log) {
    return std::tie(log.fac, log.prio, log.ldate, log.ltime, log.utcsec, log.extnum, log.tzoffset, log.host,
                    log.ip, log.prog, log.tag, log.msg);
}

inline bool operator==(const _SYSLOG_LOG_DATA_tag &left, const _SYSLOG_LOG_DATA_tag &right) {
    return EntryFields(left) == EntryFields(right);
}

// Text of about `entries` lines with every oddity that lines can have: too few fields, runs of blanks, tabs,
// carriage returns, NUL bytes, invalid UTF-8, empty lines, strange numbers, no final line feed.
inline std::string StrangeText(unsigned seed, int entries) {
    static const std::string kWords[] = {"info", "local0", "12",  "-7x",    "\t9", "\xff",
                                         "a\tb", "\r",     "+-3", "\v\f 1", "-"};
    std::mt19937 random(seed);
    const auto below = [&random](size_t limit) { return random() % limit; };
    std::string text;
    for (int entry = 0; entry < entries; ++entry) {
        for (size_t field = below(3) == 0 ? below(12) : 14; field > 0; --field) {
            text += kWords[below(std::size(kWords))];
            text.append(below(5) == 0 ? 1 + below(3) : 1, ' ');
            if (below(40) == 0)
                text += '\0';
        }
        if (below(3) == 0)
            text.erase(text.find_last_not_of(' ') + 1);
        text.append(below(6) == 0 ? below(4) : 1, '\n');
    }
    return text;
}
