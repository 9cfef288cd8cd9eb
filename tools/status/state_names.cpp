#include "status/state_names.h"

namespace kelo::tool {

const char *StateName(SyslogNgStatus::State state) {
    constexpr const char *kNames[] = {"running", "silent", "stopped", "unknown"};
    return kNames[static_cast<size_t>(state)];
}

const char *StateName(ReceiverStatus::State state) {
    constexpr const char *kNames[] = {"none", "running", "silent", "stopped", "died", "unreadable"};
    return kNames[static_cast<size_t>(state)];
}

const char *StateName(DatabaseStatus::State state) {
    constexpr const char *kNames[] = {"good", "missing", "locked", "damaged", "unreadable"};
    return kNames[static_cast<size_t>(state)];
}

const char *StateName(VolumeStatus::Level level) {
    constexpr const char *kNames[] = {"good", "nearly full", "full"};
    return kNames[static_cast<size_t>(level)];
}

} // namespace kelo::tool
