# shellcheck shell=bash
# Messages as a small office produces them, for the demo and the system tests. Sourced by bash, not run.

# make_messages COUNT FORMAT [FIRST]: prints COUNT messages, one a line and each of them different, numbered from FIRST
# (1) on. FORMAT is "old" (RFC 3164) or "new" (RFC 5424). The same arguments give the same texts, times apart. Of 100
# messages in a row 4 are errors, 6 warnings, 2 speak of a full disk.
make_messages() {
    LC_ALL=C awk -v count="$1" -v format="$2" -v first="${3:-1}" -v oldStamp="$(LC_ALL=C date '+%b %e %T')" \
        -v newStamp="$(date -u '+%Y-%m-%dT%H:%M:%SZ')" '
    BEGIN {
        hosts = split("nas web1 web2 mail backup printer switch-1 switch-2 ap-floor1 ap-floor2 db1 cam-door", host)
        users = split("alice bob carol dave erin frank", user)
        for (n = first; n < first + count; n++) {
            k = n % 100; who = user[n % users + 1]; facility = 3; severity = 6
            if (k < 4)       { program = "smartd"; severity = 3; text = "Device: /dev/sd" substr("abcd", n % 4 + 1, 1) ", " n " Currently unreadable (pending) sectors" }
            else if (k < 6)  { program = "rsyncd"; severity = 4; text = "write failed on \"share/" who "/run-" n "\": No space left on device, disk full at 100%" }
            else if (k < 10) { program = "sshd"; facility = 4; severity = 4; text = "Failed password for invalid user admin from 203.0.113." n % 250 " port " 1024 + n % 60000 " ssh2" }
            else if (k < 40) { program = "sshd"; facility = 4; text = "Accepted publickey for " who " from 192.0.2." n % 250 " port " 1024 + n % 60000 " ssh2" }
            else if (k < 60) { program = "nginx"; facility = 16; text = "192.0.2." n % 250 " - " who " \"GET /files/" n ".html HTTP/1.1\" 200 " 512 + n % 9000 }
            else if (k < 75) { program = "postfix"; facility = 2; text = sprintf("%08X: to=<%s@example.com>, relay=local, delay=0.%d, status=sent", n * 7919, who, n % 9) }
            else if (k < 85) { program = "CRON"; facility = 9; text = "(" who ") CMD (/usr/local/bin/rotate --keep " n % 30 " #" n ")" }
            else if (k < 95) { program = "smbd"; severity = 5; text = who " opened file projects\\plan-" n ".odt (write=Yes)" }
            else             { program = "kernel"; facility = 0; severity = 5; text = "[" n "." n % 1000 "] eth0: link is up, 1000 Mbps, full duplex" }
            priority = facility * 8 + severity; from = host[int(n / 3) % hosts + 1]
            if (format == "old") printf "<%d>%s %s %s[%d]: %s\n", priority, oldStamp, from, program, 300 + n % 7000, text
            else printf "<%d>1 %s %s %s %d ID%d - %s\n", priority, newStamp, from, program, 300 + n % 7000, n % 50, text
        }
    }'
}

# frame_lines: turns lines into octet-counted frames (RFC 6587).
frame_lines() { LC_ALL=C awk '{ printf "%d %s", length($0), $0 }'; }

# Texts that break careless software, each with the way that it is sent: TEXT must be in column msg unchanged.
# shellcheck disable=SC1003,SC2016,SC2034 # meant literally, used by those who source this
hostileTexts=(
    "it's 5 o'clock; DROP TABLE logs; --"
    'she said "100% sure", 50%% of the time, %s %n %d'
    'C:\temp\new_folder\ ends with a backslash\'
    'Grüße aus Köln: naïve café, Привет, 日本語のログ, 🗄️ done'
    '[brackets] *stars* ?marks? {braces} <tags> & `ticks` $HOME $(id) ${MESSAGE}'
    $'first line\nsecond line\n\tthird, with a tab'
    $'escape \e[31mred\e[0m, bell \a, not UTF-8: \xff\xfe end'
    "$(printf 'long %09000d tail' 7)"
)
