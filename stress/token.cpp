#include "token.h"

#include <charconv>
#include <cstdio>

namespace kelo::stress {
namespace {

constexpr std::string_view kStart = "tok:";
constexpr size_t kWorkerAt = 4, kWorkerDigits = 5;
constexpr size_t kNumberAt = 10, kNumberDigits = 9;
constexpr size_t kLength = 20;

bool ReadNumber(std::string_view digits, uint32_t &number) {
    const char *const end = digits.data() + digits.size();
    const auto [stop, error] = std::from_chars(digits.data(), end, number);
    return error == std::errc() && stop == end && number != 0;
}

} // namespace

std::string TextOf(const Token &token) {
    char text[64];
    std::snprintf(text, sizeof text, "tok:%05u:%09u;", token.worker, token.number);
    return text;
}

void FindTokens(std::string_view bytes, const std::function<void(const Token &)> &found) {
    for (size_t at = 0; (at = bytes.find(kStart, at)) != std::string_view::npos; at += kStart.size()) {
        const std::string_view text = bytes.substr(at, kLength);
        Token token;
        if (text.size() == kLength && text[kNumberAt - 1] == ':' && text.back() == ';' &&
            ReadNumber(text.substr(kWorkerAt, kWorkerDigits), token.worker) &&
            ReadNumber(text.substr(kNumberAt, kNumberDigits), token.number))
            found(token);
    }
}

} // namespace kelo::stress
