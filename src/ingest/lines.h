#pragma once

#include <cstring>
#include <string_view>

namespace kelo {

// Calls `handle` with every non-empty line of `text`, without its line feed.
template <typename Handle>
void ForEachLine(std::string_view text, Handle handle) {
    const char *next = text.data();
    const char *const end = next + text.size();
    while (next != end) {
        const auto left = static_cast<size_t>(end - next);
        const auto *lineFeed = static_cast<const char *>(std::memchr(next, '\n', left));
        const char *lineEnd = lineFeed != nullptr ? lineFeed : end;
        if (lineEnd != next)
            handle(std::string_view(next, static_cast<size_t>(lineEnd - next)));
        next = lineFeed != nullptr ? lineFeed + 1 : end;
    }
}

} // namespace kelo
