#pragma once

// The root that the platform's own fixed paths (spool, pid files, settings) are under.
//
// Threads: set it before there is a second one.

#include "keloplatform/export.h"

extern "C" {

// Sets the root. Null or "" (the default) leaves the fixed paths unchanged; anything else must begin with
// '/' and is prefixed to them. Paths that a caller passes in are never rewritten.
//
// Call it once, before the first use of the library. Returns 0, or -1 for a relative
// root or when out of memory, and then nothing changed.
KELOPLATFORM_API int KELORootSet(const char *root);

} // extern "C"
