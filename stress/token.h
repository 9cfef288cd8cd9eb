#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <string_view>

namespace kelo::stress {

// What a stored row is recognised by, also in the bytes of a damaged file.
struct Token {
    uint32_t worker = 0; // the number of the process that made it, from 1
    uint32_t number = 0; // counted by that process, from 1
};

// "tok:00012:000000345;"
std::string TextOf(const Token &token);

// Calls `found` for each token in `bytes`.
void FindTokens(std::string_view bytes, const std::function<void(const Token &)> &found);

} // namespace kelo::stress
