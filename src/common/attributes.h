#pragma once

#include "kelosyslog/records.h"

namespace kelo {

// Whether the column of an attribute, 0 to 18 (not checked), holds integers, so that its literals need
// no quotes.
bool IsIntegerAttribute(_SYSLOG_DB_ATTRI_tag attr);

} // namespace kelo
