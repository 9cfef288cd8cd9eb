// Any file can be read, and what a write to it accepts is read back, with all other sections as before.

#include <fuzzer/FuzzedDataProvider.h>
#include <unistd.h>

#include <fstream>
#include <map>
#include <memory>
#include <optional>

#include "keloplatform/torvc.h"
#include "quiet.h"

// A fuzzer must not wait for the machine's disk.
extern "C" int fsync(int) {
    return 0;
}

namespace {

// A folder of this process's own.
std::string Folder() {
    const char *parent = std::getenv("TMPDIR");
    std::string path = std::string(parent != nullptr ? parent : "/tmp") + "/fuzz-XXXXXX";
    if (mkdtemp(path.data()) == nullptr)
        Fail("no folder", path);
    return path;
}

struct FreeHash {
    void operator()(TORVSZHASH *hash) const { TORVCSzHashFree(hash); }
};
using Hash = std::unique_ptr<TORVSZHASH, FreeHash>;

// The section's value of a key, "" where it has none; nothing where the section cannot be read.
std::optional<std::string> Get(const std::string &path, const std::string &section, const std::string &key) {
    TORVSZHASH *hash = TORVCSzHashAlloc(4);
    const int status = TORVCFileGetSection(path.c_str(), section.c_str(), &hash);
    const Hash owner(hash);
    const char *value = TORVCSzHashGetValue(hash, key.c_str());
    return status < 0 ? std::nullopt : std::optional<std::string>(value != nullptr ? value : "");
}

// Every section with its value of a key.
std::map<std::string, std::optional<std::string>> Sections(const std::string &path, const std::string &key) {
    TORVSZLIST *list = TORVCSzListAlloc(4);
    if (TORVCFileEnumSection(path.c_str(), &list) < 0)
        Fail("not listed", path);
    std::map<std::string, std::optional<std::string>> sections;
    for (int i = 0; i < list->count; ++i)
        sections[list->items[i]] = Get(path, list->items[i], key);
    TORVCSzListFree(list);
    return sections;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    static const std::string path = Folder() + "/file";
    FuzzedDataProvider input(data, size);
    // As C strings, which end at the first NUL byte.
    const std::string section = input.ConsumeRandomLengthString(16).c_str();
    const std::string key = input.ConsumeRandomLengthString(16).c_str();
    const std::string value = input.ConsumeRandomLengthString(64).c_str();
    std::ofstream(path, std::ios::binary) << input.ConsumeRemainingBytesAsString();

    auto expected = Sections(path, key);
    TORVSZHASH *hash = TORVCSzHashAlloc(1);
    TORVCSzHashSetValue(&hash, key.c_str(), value.c_str());
    const Hash owner(hash);
    if (TORVCFileSetSection(path.c_str(), section.c_str(), section.c_str(), hash, "%s=\"%s\"\n") == 0) {
        expected[section] = value;
        if (Sections(path, key) != expected)
            Fail("a write changed more or less than it should", section);
        if (TORVCFileSetSection(path.c_str(), section.c_str(), nullptr, nullptr, nullptr) != 0)
            Fail("not removed", section);
    } else if (Sections(path, key) != expected) {
        Fail("a refused write changed the file", section);
    }
    return 0;
}
