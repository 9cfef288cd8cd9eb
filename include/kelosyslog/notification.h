#pragma once

// Notification rules, their checks, and the notifications that the log server sends.
//
//     NotificationManager manager; // loads /etc/kelosyslog/notify.conf
//     if (manager.CheckSev(log.prio))
//         manager.NotificationSendSev(log.host, log.prio, log);
//     if (const std::string keyword = manager.CheckKeyword(log.msg); !keyword.empty())
//         manager.NotificationSendKeyword(log.host, keyword, log);
//
// Notifications go to the appliance's notification service (keloplatform/kelonotify.h), which delivers them
// to the administrator. An `int` result is 0 for success and -1 for failure; failures are written to the
// system log unless stated otherwise. Fixed paths are under the root of kelosyslog/root.h. When memory runs
// out, operations throw std::bad_alloc unless they state another result.
//
// Threads: a NotificationManager is used by one thread at a time; the free functions may be called from any.

#include <cstdint>
#include <list>
#include <string>

#include "kelosyslog/export.h"
#include "kelosyslog/records.h"

struct TORVSZHASH;

// One rule: a section of the rule file.
struct _SYSLOG_NOTIFY_RULES_tag {
    std::string name; // of the section
    int32_t type = 0; // 0: severity, 1: events per second, 2: keyword; any other is in no list
    _SYSLOG_DB_PRIORITY_tag pri = SYSLOG_PRIO_EMERG; // fires for this severity and all more severe ones
    uint64_t eps = 0;                                // fires for this many events per second and more
    std::string pattern;                             // fires for a text that contains it; empty: never
    bool enable = false;
};

// The rules of the rule file at the time when the object was created.
class KELOSYSLOG_API NotificationManager {
public:
    // Loads the rules of /etc/kelosyslog/notify.conf. If that fails, the manager can be used with the rules
    // that were loaded: without rules every check fails.
    NotificationManager();
    ~NotificationManager();

    // Appends every section of the file at `path`, as a rule, to the list of its type, in file order.
    //
    // Returns -1 when the sections cannot be listed. A section that cannot be read is reported and ends the
    // loading, but the result is 0 and the rules before it stay.
    int ConfigLoad(const std::string &path);

    // Whether an enabled rule for events per second has a threshold of at most `eps`.
    bool CheckEps(uint64_t eps) const;

    // Whether an enabled severity rule has a severity that is as severe as `pri` or less severe.
    bool CheckSev(_SYSLOG_DB_PRIORITY_tag pri) const;

    // The pattern of the first enabled keyword rule that occurs in `content`, byte by byte; "" for none.
    std::string CheckKeyword(const std::string &content) const;

    // Sends the notification `tag` with the placeholders in `*hash`, to which it adds the class of the log
    // server's notifications. The hash stays the caller's and may be reallocated.
    int NotificationSend(const char *tag, TORVSZHASH **hash);

    // Events per second exceeded. The message names the threshold of the first rule in the file, even if
    // another one fired (0 when there is none).
    int NotificationSendEps(uint64_t eps);

    // The volume of a shared folder is full.
    int NotificationSendVolFull(const std::string &share);

    // A record of the severity of a rule or worse, or with the keyword of a rule, came from `host`. A content
    // that contains "Failed to send email." is not sent, with result 0: a failed notification causes no
    // other. A content of 2048 bytes or more, with quotes and backslashes escaped, is refused.
    int NotificationSendSev(const std::string &host, const std::string &sev, const std::string &content);
    int NotificationSendKeyword(const std::string &host, const std::string &keyword,
                                const std::string &content);

    int NotificationSendSev(const std::string &, int, const std::string &) = delete; // 0 is no text
    // The same with the severity's word (`pri` is 0 to 7; the word of any other is empty) and the message of
    // `log`.
    int NotificationSendSev(const std::string &host, _SYSLOG_DB_PRIORITY_tag pri,
                            const _SYSLOG_LOG_DATA_tag &log);
    int NotificationSendKeyword(const std::string &host, const std::string &keyword,
                                const _SYSLOG_LOG_DATA_tag &log);

private:
    std::list<_SYSLOG_NOTIFY_RULES_tag> sevRules;
    std::list<_SYSLOG_NOTIFY_RULES_tag> epsRules;
    std::list<_SYSLOG_NOTIFY_RULES_tag> kwRules;
};

// Reads the rule `section` of the file at `path`. A missing number is 0, a missing pattern empty, a missing
// switch off. Returns 0, or -1 with `rule` unchanged: no such file or section, or it cannot be read.
KELOSYSLOG_API int SyslogNotifyConfGet(const std::string &path, const std::string &section,
                                       _SYSLOG_NOTIFY_RULES_tag &rule);

// Writes `rule` as the section of its name into the file at `path`, replacing the section's content;
// `section` is not used. Of the threshold the low 32 bits are stored, as a signed number: from 2147483648 on
// another value is read back.
//
// Returns 0 when the rule is on the disk, or -1 with the file unchanged: it cannot be written, or it cannot
// contain the name or the pattern (for example with a line feed).
KELOSYSLOG_API int SyslogNotifyConfSet(const std::string &path, const std::string &section,
                                       const _SYSLOG_NOTIFY_RULES_tag &rule);

// Whether any channel is on: SMS, mail (switched on, with a server and a recipient), or a push service. False
// also, after a message, when any of the settings cannot be read.
KELOSYSLOG_API bool IsNotificationSet();

// Sends the notification `tag` with exactly the placeholders in `*hash`, which stays the caller's.
KELOSYSLOG_API int SyslogMailSend(const char *tag, TORVSZHASH **hash);

// A shared folder was removed or renamed, an encrypted one mounted or unmounted. -1, with nothing in the
// system log, for null and when out of memory.
KELOSYSLOG_API int SyslogMailShareRemove(const char *share);
KELOSYSLOG_API int SyslogMailShareRename(const char *share);
KELOSYSLOG_API int SyslogMailShareEncMount(const char *share);
KELOSYSLOG_API int SyslogMailShareEncUnmount(const char *share);

// As the manager's NotificationSendSev and NotificationSendKeyword, but without a host, and every content is
// sent. -1, with nothing in the system log, for null, for a content that is too long, and when out of memory.
KELOSYSLOG_API int SyslogMailSeverityExceeded(const char *sev, const char *content);
KELOSYSLOG_API int SyslogMailKeywordMatched(const char *keyword, const char *content);
