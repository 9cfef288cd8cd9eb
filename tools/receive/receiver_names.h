#pragma once

namespace kelo::tool {

// What both receivers call themselves in the event log, and the folder below --root that holds their files.
inline constexpr const char *kReceiverName = "kelosyslog receive";
inline constexpr const char *kLogFolder = "/var/log/kelolog";
inline constexpr const char *kEventDatabase = "/usr/kelo/etc/kelosyslog.db";

} // namespace kelo::tool
