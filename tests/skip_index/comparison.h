#pragma once

#include <string>
#include <vector>

#include "random_search.h"

namespace kelo::test {

// What a search gives.
struct Answer {
    int status = 0;
    int count = 0; // of a search without limits
    std::vector<std::string> rows{};

    bool operator==(const Answer &) const = default;
};

enum class WithIndex : bool { kNo, kYes };
Answer Ask(const std::string &path, RandomSearch &search, WithIndex withIndex);

// The values of a column, as one text.
std::string ValuesOf(const std::string &path, const std::string &column, WithIndex withIndex);

// Whether the last Ask of the thread was answered by the index.
bool WasServed();

// Whether `found` may be the answer in a state between those of `before` and `after`: rows were only deleted.
bool IsBetween(const Answer &found, const Answer &before, const Answer &after);

// What was searched for, and how the answers differ.
std::string Difference(const RandomSearch &search, const Answer &found, const Answer &expected);

} // namespace kelo::test
