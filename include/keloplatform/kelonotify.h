#pragma once

// The appliance's notification service, and its mail and SMS settings.
//
// Threads: the functions may be called from any thread. The settings are in the key/value file
// /etc/keloinfo.conf (keloinfo.conf(5)) under the platform's root.

#include "keloplatform/export.h"

struct TORVSZHASH;

// How mail is sent. Texts are empty where the setting is missing.
struct KELOMAIL {
    char server[256];       // host name or address of the SMTP server; empty: mail is not configured
    int port;               // TCP port; 0: the usual one of `security`
    char security[16];      // "none", "starttls" or "tls", as in the settings
    char user[256];         // empty: no authentication
    char password[256];     // secret: never log it
    char sender[320];       // address in the From field
    char recipients[4096];  // addresses, separated by commas, semicolons or blanks
    char subjectPrefix[64]; // put in front of every subject
};

// How SMS are sent: as HTTP requests to a provider.
struct KELOSMSCONF {
    int enabled;           // non-zero: SMS notification is on
    char url[2048];        // may hold secrets: never log it
    char body[4096];       // template of the request body
    char contentType[128]; // of the body
    char numbers[1024];    // phone numbers, separated by commas, semicolons or blanks
};

extern "C" {

// Sends the notification `tag` to every channel that the settings enable and the filter file allows. The
// message is rendered from the section `tag` of the file notify in the language's folder under `textsDir`;
// the keys of `*hash` are the placeholders ("%EPS%"). A missing text gives a plain message with all values.
//
// The message is put into the spool durably and the call returns: it never waits for a network. kelonotify
// delivers the spool. Nothing is spooled when no channel is left. `hash`, `*hash`, `textsDir` and
// `filterFile` may be null; the map is only read. The last argument is not used; call it with 0.
//
// Returns 0 when the message is on the disk or no channel is left, or -1 when it could not be stored, after a
// line in the system log (priority LOG_ERR) with the cause.
KELOPLATFORM_API int KELOSysNotifySendNotificationCustomized(const char *tag, const char *textsDir,
                                                             const char *filterFile, TORVSZHASH **hash, int);

// Fills `mail` from the settings. Returns 0, or -1 with an empty record: null, the settings cannot be read,
// or a value does not fit its field (which is reported in the system log without the value).
KELOPLATFORM_API int KELOMailGet(KELOMAIL *mail);

// Number of recipients in `mail`; 0 for null.
KELOPLATFORM_API int KELOMailGetMailNum(KELOMAIL *mail);

// Reads the SMS settings into a new record, to be freed with KELOSmsConfFree. Null as KELOMailGet fails, and
// when out of memory.
KELOPLATFORM_API KELOSMSCONF *KELOSmsConfGet();

// Frees the record; null is accepted.
KELOPLATFORM_API void KELOSmsConfFree(KELOSMSCONF *conf);

} // extern "C"
