#pragma once

#include <array>

namespace kelo {

enum EventKind {
    kServerStart,
    kServerStop,
    kNotifyEps,
    kNotifySeverity,
    kNotifyKeyword,
    kArchiveStart,
    kArchiveFinish,
    kArchiveFailed,
    kLogClear,
    kVolumeFull,
    kEventKindCount,
};

struct EventKindRow {
    int level;
    const char *format;
};

// Level and text of every event kind. The failure of an archive is logged as information, like its start.
inline constexpr std::array<EventKindRow, kEventKindCount> kEventKinds = {{
    {0, "Server was started [%s]."},
    {0, "Server was stopped [%s]."},
    {0, "Event detection: EPS is larger than [%llu]."},
    {0, "Event detection: Received log which severity is [%s]. Log content: [%s]"},
    {0, "Event detection: Received log which contains [%s]. Log content: [%s]"},
    {0, "Log database [%s] starts to archive."},
    {0, "Log database [%s] has been archived."},
    {0, "Log database [%s] is failed to archived."},
    {0, "Log was cleared."},
    {1, "Volume space is not enough."},
}};

} // namespace kelo
