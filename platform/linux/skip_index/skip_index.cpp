#include "skip_index/skip_index.h"

#include <cstdlib>
#include <string_view>
#include <utility>

#include "skip_index/builder.h"

namespace kelo::platform {

thread_local int64_t lastLag = -1;

bool IsSwitchedOff() {
    const char *setting = std::getenv("KELO_SKIP_INDEX");
    return setting != nullptr && std::string_view(setting) == "off";
}

std::optional<SkipIndex> SkipIndex::Open(sqlite3 *db) {
    if (IsSwitchedOff())
        return std::nullopt;
    std::string path = FileOf(db);
    const auto identity = path.empty() ? std::nullopt : IdentityOf(path);
    if (!identity)
        return std::nullopt;
    auto file = IndexFile::Open(path, *identity, IndexFile::Access::kRead);
    IndexHeader header;
    if (!file || file->ReadHeader(header) != IndexFile::State::kGood)
        return std::nullopt;
    return SkipIndex(std::move(path), *identity, std::move(*file), header);
}

void SkipIndex::Discard() const {
    DiscardIndex(dbPath_, identity_, header_);
}

} // namespace kelo::platform
