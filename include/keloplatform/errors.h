#pragma once

// Why something failed, as a value. Without these functions the reason is only in the system log.
//
// They are an addition of this platform, like root.h. An appliance's own platform may lack them, so
// libkelosyslog does not call them.
//
// Threads: the functions may be called from any thread.

#include <string>

#include "keloplatform/export.h"

// Why the keyword `pattern` (see gensqlregexp.h) is invalid: the first line that GenSQLRegexp writes to the
// system log for it, or "" when all its regular expressions are valid.
//
//   KELOKeywordError("/fail(ed/")   Broken regular expression [fail(ed] in a search keyword matches nothing:
//                                   missing ): fail(ed
//
// One line without control characters. Nothing is logged. Throws nothing but std::bad_alloc and
// std::length_error.
KELOPLATFORM_API std::string KELOKeywordError(const std::string &pattern);

extern "C" {

// Why the calling thread's last call of KELOSystemdReload or KELOSysNotifySendNotificationCustomized failed:
// the line that it wrote to the system log, or "" when it succeeded. Never null; valid until the thread's
// next call of one of the two. For statements see KELODBErrorGet.
KELOPLATFORM_API const char *KELOErrorGet();

} // extern "C"
