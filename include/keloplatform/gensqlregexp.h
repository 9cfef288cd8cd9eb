#pragma once

// The keyword language of log searches, turned into SQL.

#include <string>

#include "keloplatform/export.h"

// Returns an SQL boolean expression that is true for the rows whose text column `column` matches the keyword
// `pattern`.
KELOPLATFORM_API std::string GenSQLRegexp(std::string pattern, std::string column);
