#include "search/letter_case.h"

#include <algorithm>
#include <cstddef>

namespace kelo::platform {
namespace {

bool IsCapital(char byte) {
    return byte >= 'A' && byte <= 'Z';
}

// Length of the beginning of `rest` up to and including the first of `ends`.
size_t LengthThrough(std::string_view rest, std::string_view ends) {
    const size_t end = rest.find_first_of(ends);
    return end == std::string_view::npos ? rest.size() : end + 1;
}

// Length of the escape at the start of `rest`: a backslash and its characters.
size_t EscapeLength(std::string_view rest) {
    const char kind = rest.size() > 1 ? rest[1] : '\0';
    if (kind != 'p' && kind != 'P' && kind != 'x')
        return 2;
    if (rest.size() > 2 && rest[2] == '{')
        return LengthThrough(rest, "}");
    return kind == 'x' ? 4 : 3;
}

// Length of the construct at the start of `rest` (not empty) whose letters are names and not text.
size_t NamingLength(std::string_view rest) {
    if (rest[0] == '\\')
        return EscapeLength(rest);
    if (rest.starts_with("(?P<"))
        return LengthThrough(rest, ">");
    if (rest.starts_with("(?"))
        return LengthThrough(rest, ":)");
    return 0;
}

} // namespace

bool HasCapitals(std::string_view text) {
    return std::any_of(text.begin(), text.end(), IsCapital);
}

bool RegexHasCapitals(std::string_view regex) {
    while (!regex.empty()) {
        const size_t naming = NamingLength(regex);
        if (naming == 0 && IsCapital(regex[0]))
            return true;
        regex.remove_prefix(std::min(std::max<size_t>(naming, 1), regex.size()));
    }
    return false;
}

} // namespace kelo::platform
