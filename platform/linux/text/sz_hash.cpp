#include "text/sz_hash.h"

#include <algorithm>
#include <memory>

#include "common/catch_bad_alloc.h"
#include "common/failure.h"

using kelo::platform::CatchBadAlloc;
using kelo::platform::Recorded;

namespace {

// A larger table is allocated only when there are keys for it.
constexpr size_t kMaxReserved = 65536;

} // namespace

const TORVSZHASH::Entry *TORVSZHASH::Find(std::string_view key) const {
    const auto found = index.find(key);
    return found != index.end() ? found->second : nullptr;
}

void TORVSZHASH::Set(std::string_view key, std::string_view value) {
    const auto found = index.find(key);
    if (found != index.end()) {
        found->second->value = std::string(value);
        return;
    }
    std::list<Entry> added;
    added.push_back({std::string(key), std::string(value)});
    index.emplace(added.front().key, &added.front());
    entries.splice(entries.end(), added);
}

TORVSZHASH *TORVCSzHashAlloc(size_t size) {
    const auto make = [&] {
        auto hash = std::make_unique<TORVSZHASH>();
        hash->index.reserve(std::min(size, kMaxReserved));
        return hash.release();
    };
    return Recorded("TORVCSzHashAlloc", nullptr, CatchBadAlloc<TORVSZHASH *>(nullptr, make));
}

int TORVCSzHashSetValue(TORVSZHASH **hash, const char *key, const char *value) {
    if (hash == nullptr || *hash == nullptr || key == nullptr || value == nullptr) {
        errno = EINVAL;
        return Recorded("TORVCSzHashSetValue", nullptr, -1);
    }
    const auto set = [&] {
        (*hash)->Set(key, value);
        return 0;
    };
    return Recorded("TORVCSzHashSetValue", nullptr, CatchBadAlloc(-1, set));
}

const char *TORVCSzHashGetValue(const TORVSZHASH *hash, const char *key) {
    if (hash == nullptr || key == nullptr)
        return nullptr;
    const TORVSZHASH::Entry *entry = hash->Find(key);
    return entry != nullptr ? entry->value.c_str() : nullptr;
}

int TORVCSzHashWalk(const TORVSZHASH *hash, int (*handle)(const char *key, const char *value, void *context),
                    void *context) {
    if (hash == nullptr || handle == nullptr)
        return 0;
    for (const TORVSZHASH::Entry &entry : hash->entries) {
        if (const int result = handle(entry.key.c_str(), entry.value.c_str(), context); result != 0)
            return result;
    }
    return 0;
}

void TORVCSzHashFree(TORVSZHASH *hash) {
    delete hash;
}
