#pragma once

// Sending a notification exactly once, by a program that may be killed at any time and notes in a database
// what it has sent: hold it, note that, release it. What is held survives a crash and is not delivered.
//
//     KELONotifyHold(id);       // the next notifications of this thread replace what is held under `id`
//     manager.NotificationSendSev(host, severity, content);
//     KELONotifyHold(nullptr);
//     ... commit "id is held" ...
//     KELONotifyRelease(id);    // again after a kill: without effect if it was released before
//
// They are an addition of this platform, like root.h.
//
// Threads: the functions may be called from any thread; each holds its own notifications.

#include "keloplatform/export.h"

extern "C" {

// From now on a notification of the calling thread is held under this id, until the call with null. The id is
// that of the notification, too: letters, digits, '.', '-' and '_', no '.' first, at most 100 bytes. Their
// byte order is the order of delivery.
KELOPLATFORM_API void KELONotifyHold(const char *id);

// Lets what is held under the id be delivered. Returns 0 when it is on the disk, also when nothing is held;
// -1 with errno set, and may be called again.
KELOPLATFORM_API int KELONotifyRelease(const char *id);

} // extern "C"
