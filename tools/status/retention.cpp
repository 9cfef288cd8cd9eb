#include "status/retention.h"

#include <filesystem>

#include "base/errors.h"
#include "read/log_table.h"
#include "retention/reception.h"
#include "retention/retention_state.h"

namespace kelo::tool {

RetentionStatus GatherRetention(const std::string &root) {
    RetentionStatus status;
    status.isReceptionStopped = Reception(root).IsStopped();
    try {
        const std::filesystem::path path = ResolveLogTable({}, root).path;
        status.rule = LoadRetentionRule(root, VolumeOf(root, path.parent_path().string()));
        if (status.rule)
            status.problem = ReadRetentionState(root).problem;
    } catch (const DatabaseError &error) {
        status.problem = error.what();
    }
    return status;
}

} // namespace kelo::tool
