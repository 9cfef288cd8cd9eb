#pragma once

#include "base/volumes.h"
#include "status/databases.h"
#include "status/receiver.h"
#include "status/syslog_ng.h"

namespace kelo::tool {

// The names of states on the screen and in JSON: "running", "silent", "stopped", "unknown"; "none",
// "running", "silent", "stopped", "died", "unreadable"; "good", "missing", "locked", "damaged", "unreadable";
// "good", "nearly full", "full".
const char *StateName(SyslogNgStatus::State state);
const char *StateName(ReceiverStatus::State state);
const char *StateName(DatabaseStatus::State state);
const char *StateName(VolumeStatus::Level level);

} // namespace kelo::tool
