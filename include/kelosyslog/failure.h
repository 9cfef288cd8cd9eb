#pragma once

// Why a function of this library failed, as a value: the results say only that it did.
//
//     const int count = SyslogDBSelectCount("/var/log/logs.db", {}, nullptr, nullptr);
//     if (count < 0 && SyslogFailureGet()->kind == KELO_FAILURE_BUSY)
//         puts("somebody else keeps the database locked: try again");
//
// The record (keloplatform/failure.h) has the kind, SQLite's code or errno, the path, what was tried, and the
// reason as a text without the path.
//
// - Every function that reports a failure by its result sets it. A success leaves it as it is, like errno:
//   look at it after a failure, or clear it before a call whose result can mean both, such as 0 or an empty
//   map.
// - LogSearchCondListGen sets it, with KELO_FAILURE_REGEX, when the keyword has a broken regular expression,
//   which matches nothing.
// - What a function reports but tolerates may set it too: a rotation that fails after Logger::LogAdd has
//   stored its event.
// - std::bad_alloc is its own reason and sets nothing.
//
// Threads: each one has a record of its own, so the functions may be called from any.

#include "keloplatform/failure.h"
#include "kelosyslog/export.h"

extern "C" {

// The last failure of this library in the calling thread; of kind KELO_FAILURE_NONE when there was none.
// Never null. The record belongs to the thread and changes with its next failure.
KELOSYSLOG_API const KELOFAILURE *SyslogFailureGet();

// Forgets the last failure; its count stays.
KELOSYSLOG_API void SyslogFailureClear();

} // extern "C"
