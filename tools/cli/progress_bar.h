#pragma once

#include <cstdint>

namespace kelo::tool {

// How much of a piece of work is done, on the last line of the terminal behind the standard error. Without a
// terminal, or when the size is not known, it shows nothing.
class ProgressBar {
public:
    enum class Unit { Bytes, Records };

    // `total` is 0 when it is not known.
    explicit ProgressBar(uint64_t total, Unit unit = Unit::Bytes);
    ~ProgressBar();
    ProgressBar(const ProgressBar &) = delete;
    ProgressBar &operator=(const ProgressBar &) = delete;

    void Add(uint64_t done);

    // Removes it, so that a message can be written; the next Add shows it again.
    void Clear();

private:
    uint64_t total_;
    Unit unit_;
    uint64_t done_ = 0;
    int shownPercent_ = -1; // -1: not shown
};

} // namespace kelo::tool
