#include "cli/progress_bar.h"

#include <unistd.h>

#include <algorithm>
#include <cstdio>

namespace kelo::tool {

ProgressBar::ProgressBar(uint64_t total, Unit unit)
    : total_(isatty(STDERR_FILENO) == 1 ? total : 0), unit_(unit) {}

ProgressBar::~ProgressBar() {
    Clear();
}

void ProgressBar::Add(uint64_t done) {
    if (total_ == 0)
        return;
    done_ = std::min(done_ + done, total_);
    const int percent = static_cast<int>(100.0 * static_cast<double>(done_) / static_cast<double>(total_));
    if (percent == shownPercent_)
        return;
    shownPercent_ = percent;
    constexpr char kFull[] = "########################################";
    constexpr int kWidth = sizeof kFull - 1;
    std::fprintf(stderr, "\r[%-*.*s] %3d%% of ", kWidth, percent * kWidth / 100, kFull, percent);
    if (unit_ == Unit::Bytes)
        std::fprintf(stderr, "%.1f MiB", static_cast<double>(total_) / (1 << 20));
    else
        std::fprintf(stderr, "%llu records", static_cast<unsigned long long>(total_));
}

void ProgressBar::Clear() {
    if (shownPercent_ < 0)
        return;
    shownPercent_ = -1;
    std::fputs("\r\x1b[K", stderr);
}

} // namespace kelo::tool
