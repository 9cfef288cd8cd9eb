#pragma once

#include <string>

#include "kelosyslog/records.h"

namespace kelo::bench {

// The line of log text of `number`, 200 bytes without its line feed.
inline std::string LogLine(int number) {
    std::string line = "daemon info 2020/01/02 10:11:12 " + std::to_string(1577931072 + number) +
                       " 7 +08:00 host" + std::to_string(10 + number % 50) + " 192.168.100." +
                       std::to_string(100 + number % 100) + " service" + std::to_string(10 + number % 20) +
                       " 1e request " + std::to_string(number) + " from user" + std::to_string(number % 97);
    line.append(200 - line.size(), 'm');
    return line;
}

inline std::string LogText(int lines) {
    std::string text;
    text.reserve(static_cast<size_t>(lines) * 201);
    for (int number = 0; number < lines; ++number)
        text.append(LogLine(number)).append(1, '\n');
    return text;
}

} // namespace kelo::bench
