#pragma once

// The debug channel that the library reports through.
//
// Threads: all of it may be used from any thread, by several at a time.

#include <cstdint>
#include <string>

#include "kelosyslog/export.h"

// Failures have level 0 and go to the system log at error priority. Traces have level 2 and are dropped,
// unless a program asks for them.
class KELOSYSLOG_API Debuger {
public:
    // Writes `text` to the system log: at priority LOG_ERR when `level` is 0 or below, at LOG_DEBUG when it
    // is above 0 and at most the threshold, else not at all.
    static void MSG(int32_t level, std::string text);

    // Sets the highest level that is written, 0 at the start, for the whole process. Levels of 0 and below
    // are written whatever the threshold.
    static void ThresholdSet(int32_t level);

    // The current threshold. A text of a higher level need not be composed.
    static int32_t ThresholdGet();

private:
    [[maybe_unused]] int32_t level_ = 0;
    [[maybe_unused]] std::string text_;
};
