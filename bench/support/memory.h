#pragma once

#include <cstddef>
#include <functional>

namespace kelo::bench {

// Bytes of resident memory that the process needs at the peak of `work` beyond what it has before.
size_t PeakMemoryOf(const std::function<void()> &work);

} // namespace kelo::bench
