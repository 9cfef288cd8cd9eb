#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace kelo::tool {

// One notification of the spool; docs/notification-spool.md describes its file. The texts are unchanged: a
// sender must escape them for their use.
struct Entry {
    std::string id;
    int64_t time = 0; // seconds since the epoch
    std::string tag;
    std::string className; // of the desktop application
    std::vector<std::string> channels;
    std::string title;
    std::string body;
};

// Whether the text has the form of an id: letters, digits, '.', '-' and '_', no '.' first, up to 100 of them.
// Such a text is safe as a part of a path, a header and a request.
bool IsEntryId(const std::string &text);

// Reads an entry. Throws std::runtime_error with the reason when it is damaged, is of a higher version, or
// has another id.
Entry ParseEntry(const std::string &content, const std::string &id);

} // namespace kelo::tool
