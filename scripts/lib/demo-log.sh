# shellcheck shell=bash
# A log server as it looks after two days of work, below a folder: for the demo in the browser and the tests of the page. Sourced by
# bash, not run. Needs scripts/lib/messages.sh.

# demo_lines COUNT: COUNT lines of log text (kelosyslog parse) of the last two days, by day more than by night. Yesterday had a
# printer that is silent now, today has a new camera, and an attack on ssh came an hour ago.
demo_lines() {
    make_messages "$1" new | LC_ALL=C awk -v count="$1" -v now="$(date +%s)" -v zone="$(date +%:z)" '
    function rhythm(hour) { return 1 + 0.8 * sin((hour - 9) * 3.14159 / 12) + (hour >= 9 && hour < 18 ? 0.7 : 0) }
    BEGIN {
        split("kern user mail daemon auth syslog lpr news uucp cron authpriv ftp ntp audit alert2 clock local0", facility)
        split("emerg alert crit err warning notice info debug", severity)
        # The seconds of two days in steps, with the part of all logs that came before each.
        for (step = 0; step < 576; step++) { total += rhythm(((now - 172800 + step * 300) % 86400) / 3600); sum[step] = total }
        step = 0
    }
    {
        number = NR
        while (step < 575 && sum[step] < total * number / count) { step++; inStep = 0 }
        time = now - 172800 + step * 300 + int(300 * ((number * 0.618034) % 1))
        if (time > now) time = now
        match($1, /[0-9]+/); priority = substr($1, RSTART, RLENGTH) + 0
        host = $3; program = $4; text = $0
        for (field = 0; field < 7; field++) sub(/^[^ ]+ /, "", text)
        if (host == "printer" && time > now - 79200) host = "nas"
        if (host == "cam-door" && time < now - 72000) host = "web1"
        if (host ~ /^ap-/ && number % 3) host = "nas"
        if (number % 977 == 0) { priority = 2; program = "smartd"; host = "nas"; text = "Device: /dev/sda, SMART status: FAILED" }
        if (time > now - 3900 && time < now - 3000) { priority = 36; program = "sshd"; host = "web1"; text = "Failed password for root from 203.0.113.7 port " 1024 + number % 60000 " ssh2" }
        at = host; gsub(/[^0-9]/, "", at)
        print facility[int(priority / 8) + 1], severity[priority % 8 + 1], strftime("%Y/%m/%d %H:%M:%S", time), time, number, zone,
              host, "192.0.2." length(host) * 7 + at, program, sprintf("%02x", priority), text
    }' | sort -s -n -k 5,5
}

# demo_log ROOT PROGRAM COUNT: the log, its accounting, events, rules, archives and waiting notifications below ROOT.
demo_log() {
    local root=$1 program=$2 logs=$1/var/log/kelosyslog schema
    schema=$(readlink -f "$(dirname "${BASH_SOURCE[0]}")/../../package/schema")
    mkdir -p "$root"/{etc/kelosyslog,run,var/lib/syslog-ng,var/spool/kelonotify,var/log/kelolog,usr/kelo/etc,usr/kelo/syslog} "$logs/archive"
    [[ -e $root/usr/kelo/syslog/schema ]] || ln -s "$schema" "$root/usr/kelo/syslog/schema"
    sqlite3 "$logs/logs.db" <"$schema/logs.sql" >/dev/null
    sqlite3 "$root/var/log/kelolog/.KELOACCOUNTDB" <"$schema/accinfo.sql" >/dev/null
    demo_lines "$3" | "$program" parse --db "$logs/logs.db" - >/dev/null 2>&1
    sqlite3 -batch "$root/var/log/kelolog/.KELOACCOUNTDB" "ATTACH '$logs/logs.db' AS working;
        INSERT INTO eps (stamp, device, eps) SELECT utcsec, host, count(*) FROM logs GROUP BY 1, 2;
        INSERT INTO histogram (device, count) SELECT device, sum(eps) FROM eps GROUP BY 1;"
    "$program" --root "$root" rules add critical --severity crit
    "$program" --root "$root" rules add 'disk full' --keyword 'disk full'
    "$program" --root "$root" rules add flood --eps 200
    "$program" --root "$root" rules add night --keyword 'after hours' --disabled
    "$program" --root "$root" events add server-start 1.0
    "$program" --root "$root" events add keyword 'disk full' backup
    "$program" --root "$root" events add volume-full
    "$program" --root "$root" archive --device printer --yes >/dev/null 2>&1
}
