#pragma once

#include <list>
#include <string>
#include <string_view>
#include <unordered_map>

#include "keloplatform/torvc.h"

struct TORVSZHASH {
    struct Entry {
        std::string key;
        std::string value;
    };
    // In the order in which the keys were first set; the index refers to the list's own strings.
    std::list<Entry> entries;
    std::unordered_map<std::string_view, Entry *> index;

    // Null when there is no such key.
    const Entry *Find(std::string_view key) const;
    void Set(std::string_view key, std::string_view value);
};
