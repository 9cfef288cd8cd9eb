# shellcheck shell=bash
# kelosyslog status shows the state of a real syslog-ng with its counters, and detects that it is gone or suspended.
source "$(dirname "$0")/support.sh"
export PATH=$KELO_BIN_DIR:$PATH
mkdir -p "$root/var/log/kelolog"
define "$root/kelosyslog.conf" kelo_db "$root/var/log/kelolog/logs.db"
database=$root/var/log/kelolog/logs.db

status_of() { kelosyslog status --root "$root" --control "$root/syslog-ng.ctl" "$@"; }
has() { status_of -o json | grep -qF "$1"; } # TEXT

syslog_ng_start "$root"
make_messages 10 old >"$root/lines"
send_lines "$root/lines"
landed 10
wait_until 20 has '"written":10' || fail "no counters: $(status_of -o json)"
status_of >"$root/screen" || fail "not well: $(<"$root/screen")"
grep -q "^syslog-ng      running since .*, process $(<"$root/pid")\$" "$root/screen" || fail "$(<"$root/screen")"

kill -s STOP "$(<"$root/pid")"
expect "status of one that is suspended" "$(status_of >"$root/screen"; echo $?)" 1
kill -s CONT "$(<"$root/pid")"
grep -q '^! syslog-ng runs and does not answer' "$root/screen" || fail "$(<"$root/screen")"

syslog_ng_stop "$root"
expect "status of one that is gone" "$(status_of >"$root/screen"; echo $?)" 1
grep -q '^! syslog-ng is not running' "$root/screen" || fail "$(<"$root/screen")"
