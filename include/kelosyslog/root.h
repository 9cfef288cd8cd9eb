#pragma once

// The root that the library's fixed paths are under.
//
// Threads: set it before there is a second one.

#include <string>

#include "kelosyslog/export.h"

// Prefixes `root` to every fixed path of the library (databases, schemas, rule file, settings, texts).
// The default is empty: the paths are exactly the fixed ones. Paths that a caller passes to a function are
// never rewritten.
//
// Call it once at the start of a program. Returns 0, or -1 when `root` is neither
// empty nor absolute, and then nothing changed.
KELOSYSLOG_API int SyslogRootSet(const std::string &root);
