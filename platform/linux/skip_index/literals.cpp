#include "skip_index/literals.h"

#include <cstddef>

namespace kelo::platform {
namespace {

// Collects literal text that wildcards interrupt.
class Collector {
public:
    void Add(char byte) { literals_.back() += byte; }
    void Interrupt() {
        if (!literals_.back().empty())
            literals_.emplace_back();
    }
    std::vector<std::string> Take() { return std::move(literals_); }

private:
    std::vector<std::string> literals_ = {""};
};

} // namespace

std::vector<std::string> LiteralsOfLike(std::string_view pattern, char escape) {
    Collector literals;
    for (size_t at = 0; at < pattern.size(); ++at) {
        if (escape != '\0' && pattern[at] == escape) {
            if (++at < pattern.size())
                literals.Add(pattern[at]);
        } else if (pattern[at] == '%' || pattern[at] == '_') {
            literals.Interrupt();
        } else {
            literals.Add(pattern[at]);
        }
    }
    return literals.Take();
}

std::vector<std::string> LiteralsOfGlob(std::string_view pattern) {
    Collector literals;
    for (size_t at = 0; at < pattern.size(); ++at) {
        if (pattern[at] == '*' || pattern[at] == '?') {
            literals.Interrupt();
        } else if (pattern[at] != '[') {
            literals.Add(pattern[at]);
        } else if (at + 2 < pattern.size() && pattern[at + 1] != '^' && pattern[at + 2] == ']') {
            literals.Add(pattern[at + 1]); // a set of one character, which is how a special one is written
            at += 2;
        } else {
            break; // a larger set: what follows it is not worth a parser
        }
    }
    return literals.Take();
}

} // namespace kelo::platform
