#include "cli/progress_bar.h"

#include <unistd.h>

#include <algorithm>
#include <cstdio>

namespace kelo::tool {

ProgressBar::ProgressBar(uint64_t totalBytes) : totalBytes_(isatty(STDERR_FILENO) == 1 ? totalBytes : 0) {}

ProgressBar::~ProgressBar() {
    Clear();
}

void ProgressBar::Add(uint64_t bytes) {
    if (totalBytes_ == 0)
        return;
    doneBytes_ = std::min(doneBytes_ + bytes, totalBytes_);
    const int percent =
        static_cast<int>(100.0 * static_cast<double>(doneBytes_) / static_cast<double>(totalBytes_));
    if (percent == shownPercent_)
        return;
    shownPercent_ = percent;
    constexpr char kFull[] = "########################################";
    constexpr int kWidth = sizeof kFull - 1;
    std::fprintf(stderr, "\r[%-*.*s] %3d%% of %.1f MiB", kWidth, percent * kWidth / 100, kFull, percent,
                 static_cast<double>(totalBytes_) / (1 << 20));
}

void ProgressBar::Clear() {
    if (shownPercent_ < 0)
        return;
    shownPercent_ = -1;
    std::fputs("\r\x1b[K", stderr);
}

} // namespace kelo::tool
