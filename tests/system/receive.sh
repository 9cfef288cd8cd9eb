# shellcheck shell=bash
# Messages sent to syslog-ng in both formats and framings are stored, counted and checked, each once, in every way of storing.
# usage: receive.sh database|receiver|spool
source "$(dirname "$0")/support.sh"
define "$root/kelosyslog.conf" kelo_store "$1"
mkdir -p "$root/etc/kelosyslog"
printf '[%s]\nnotify_type="0"\nnotify_pri="3"\nnotify_enable="1"\n' worse >"$root/etc/kelosyslog/notify.conf"
accounting=$root/var/log/kelolog/.KELOACCOUNTDB # looked at once it is there: the shell would create an empty one
counted() { [[ -s $accounting && $(sql "$accounting" 'SELECT sum(count) FROM histogram') == "$1" ]]; }
await_counted() { wait_until 30 counted "$1" || fail "counted are not $1"; }
notifications() { find "$root/var/spool/kelonotify/new" -name '*.json' 2>/dev/null | wc -l; }

syslog_ng_start "$root"
make_messages 3000 old >"$root/lines"
make_messages 2000 new 3001 >>"$root/lines"
make_messages 1000 new 5001 | frame_lines >"$root/frames"
for text in "${hostileTexts[@]}"; do
    printf '<163>1 - lab hostile 7 - - %s' "$text" | add_frame "$root/frames"
done
total=$((6000 + ${#hostileTexts[@]}))
send_lines "$root/lines"
send_frames "$root/frames"
landed $total
make_messages 6000 old | sed 's/^.*\]: //' | sort >"$root/wanted"
query "SELECT msg FROM logs WHERE prog != 'hostile'" | sort >"$root/found"
cmp "$root/wanted" "$root/found" || fail "the texts differ"
expect "errors" "$(row_count "$database" "prog != 'hostile' AND prio = 'err' AND llevel = 'err'")" 240
await_counted $total
expect "rows of the hostile texts" "$(row_count "$database" "prog = 'hostile' AND host = 'lab'")" ${#hostileTexts[@]}
expect "notifications of a flood" "$(notifications)" 10

kelosyslog() { "$KELO_BIN_DIR/kelosyslog" "$1" --root "$root" "${@:2}"; }
has_counted() { kelosyslog status -o json --control "$root/syslog-ng.ctl" >"$root/status" && grep -q "\"written\":$total}" "$root/status"; }
wait_until 20 has_counted || fail "not well: $(<"$root/status")"

if [[ $1 != database ]]; then
    # What comes while the database is locked waits. A reload then makes syslog-ng send one message again at most, into a pipe.
    lock_database
    make_messages 20000 new 10001 >"$root/lines"
    send_lines "$root/lines"
    wait_until 20 grep -q '"waiting":"[^"]' "$root/run/kelosyslog/receive.json" || fail "it does not wait"
    receiver=$(receiver_pid "$root")
    syslog_ng_control "$root" reload >/dev/null || fail "no reload"
    unlock_database
    sent=$((total + 20000))
    landed $sent
    wait_until 20 grep -q '"waiting":""' "$root/run/kelosyslog/receive.json" || fail "it still waits"
    total=$(row_count "$database")
    expect "messages" "$(query 'SELECT count(DISTINCT msg), count(*) - count(DISTINCT msg) <= 1 FROM logs')" "$sent|1"
    await_counted "$total"
    expect "receiver after a reload" "$(receiver_pid "$root")" "$receiver"
fi
# A rule that comes while everything runs.
kelosyslog rules add zebras --keyword zebra
zebra_told() {
    send_lines <(echo '<13>Jan  1 00:00:00 zoo keeper: a zebra')
    total=$((total + 1))
    grep -rqs KEYWORD_MATCH "$root/var/spool/kelonotify/new"
}
wait_until 30 zebra_told || fail "the new rule does not fire"
landed "$total"
syslog_ng_stop "$root"
expect "rows" "$(row_count "$database")" "$total"
counted "$total" || fail "not all are counted at the end"
expect "end of the last receiver" "$(sqlite3 "$root/usr/kelo/etc/kelosyslog.db" \
    "SELECT count(*) FROM log WHERE event = 'Server was stopped [kelosyslog receive].'")" 1
