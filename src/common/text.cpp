#include "kelosyslog/utils.h"

#include <charconv>

std::list<std::string> Tokenize(const std::string &text, const std::string &delimiters) {
    std::list<std::string> pieces;
    if (text.empty())
        return pieces;
    size_t start = 0;
    for (;;) {
        const size_t end = text.find_first_of(delimiters, start);
        if (end == std::string::npos)
            break;
        pieces.emplace_back(text, start, end - start);
        start = end + 1;
    }
    pieces.emplace_back(text, start);
    return pieces;
}

std::string ullNumberToString(unsigned long long number) {
    char digits[20]; // 18446744073709551615
    const auto end = std::to_chars(digits, digits + sizeof digits, number).ptr;
    return std::string(digits, end);
}
