#include "kelosyslog/debuger.h"

#include <syslog.h>

#include <atomic>

namespace {

std::atomic<int32_t> threshold{0};

} // namespace

void Debuger::MSG(int32_t level, std::string text) {
    if (level <= 0)
        syslog(LOG_ERR, "%s", text.c_str());
    else if (level <= threshold)
        syslog(LOG_DEBUG, "%s", text.c_str());
}

void Debuger::ThresholdSet(int32_t level) {
    threshold = level;
}

int32_t Debuger::ThresholdGet() {
    return threshold;
}
