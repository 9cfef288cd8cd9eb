#include "retention/retention_state.h"

#include <filesystem>

#include "base/atomic_file.h"
#include "base/files.h"

namespace kelo::tool {
namespace {

constexpr char kLow[] = "low ";
constexpr char kEnough[] = "enough ";

std::string PathOf(const std::string &root) {
    return root + "/run/kelosyslog-retention/state";
}

} // namespace

RetentionState ReadRetentionState(const std::string &root) {
    const std::string text = ReadWhole(PathOf(root)).value_or("");
    const size_t blank = text.find(' ');
    return {text.starts_with(kLow), blank == std::string::npos ? "" : text.substr(blank + 1)};
}

void WriteRetentionState(const std::string &root, const RetentionState &state) {
    const std::string path = PathOf(root);
    std::error_code ignored; // the file reports it
    std::filesystem::create_directories(std::filesystem::path(path).parent_path(), ignored);
    AtomicFile file(path);
    file.Write((state.isLow ? kLow : kEnough) + state.problem);
    file.Commit();
}

} // namespace kelo::tool
