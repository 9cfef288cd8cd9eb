#pragma once

#include <systemd/sd-daemon.h>
#include <systemd/sd-event.h>

#include "base/late_function.h"

namespace kelo::tool {

// The functions of libsystemd that are used, loaded at the first call.
#define KELO_SYSTEMD(name)                                                                                   \
    inline constinit const LateFunction<decltype(::name)> name("libsystemd.so.0", #name)
KELO_SYSTEMD(sd_event_add_defer);
KELO_SYSTEMD(sd_event_add_io);
KELO_SYSTEMD(sd_event_add_signal);
KELO_SYSTEMD(sd_event_add_time);
KELO_SYSTEMD(sd_event_new);
KELO_SYSTEMD(sd_event_run);
KELO_SYSTEMD(sd_event_set_watchdog);
KELO_SYSTEMD(sd_event_source_disable_unref);
KELO_SYSTEMD(sd_event_source_set_enabled);
KELO_SYSTEMD(sd_event_source_set_priority);
KELO_SYSTEMD(sd_event_source_set_time);
KELO_SYSTEMD(sd_event_unref);
KELO_SYSTEMD(sd_notify);
#undef KELO_SYSTEMD

} // namespace kelo::tool
