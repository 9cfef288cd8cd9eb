#pragma once

#include <memory>
#include <string>

#include "keloplatform/torvc.h"

namespace kelo {

// Initial capacity of the library's maps and lists.
inline constexpr size_t kSzCapacity = 1024;

struct SzListFreer {
    void operator()(TORVSZLIST *list) const { TORVCSzListFree(list); }
};
// A list of strings that frees itself.
using SzList = std::unique_ptr<TORVSZLIST, SzListFreer>;

// A map of strings that frees itself. The platform may reallocate it whenever a value is set, so it is passed
// by the address of its pointer.
class SzHash {
public:
    // Allocates; false in a condition when that failed.
    SzHash() : hash_(TORVCSzHashAlloc(kSzCapacity)) {}
    ~SzHash() { TORVCSzHashFree(hash_); }
    SzHash(const SzHash &) = delete;
    SzHash &operator=(const SzHash &) = delete;

    explicit operator bool() const { return hash_ != nullptr; }
    TORVSZHASH **Address() { return &hash_; }

    // False when the value could not be set.
    bool Set(const char *key, const std::string &value) {
        return TORVCSzHashSetValue(&hash_, key, value.c_str()) >= 0;
    }
    // Null when there is no such key. The text belongs to the map.
    const char *Get(const char *key) const { return TORVCSzHashGetValue(hash_, key); }

private:
    TORVSZHASH *hash_;
};

} // namespace kelo
