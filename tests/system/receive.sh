# shellcheck shell=bash
# Messages sent to syslog-ng are stored, counted and checked, with either of syslog-ng and the receiver storing them.
# usage: receive.sh database|receiver
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
await_counted $total
expect "rows of the hostile texts" "$(row_count "$database" "prog = 'hostile' AND host = 'lab'")" ${#hostileTexts[@]}
expect "notifications of a flood" "$(notifications)" 10

case $1 in
database)
    # The receiver is killed in the middle: no row is missing, and the next one counts what follows.
    killed=$(receiver_pid "$root")
    make_messages 20000 new 10001 >"$root/lines"
    send_lines "$root/lines" &
    wait_until 30 has_rows "$database" $((total + 1000)) || fail "nothing arrives"
    kill -s KILL "$killed"
    wait $!
    landed $((total + 20000))
    expect "rows" "$(row_count "$database")" $((total + 20000))
    restarted() { [[ $(receiver_pid "$root") != "$killed" ]]; }
    wait_until 30 restarted || fail "no new receiver"
    ;;
receiver)
    # What comes while the database is locked waits. A reload then makes syslog-ng send one message again at most.
    lock_database
    make_messages 20000 new 10001 >"$root/lines"
    sent=$((total + 20000))
    send_lines "$root/lines"
    wait_until 20 grep -q '"waiting":"[^"]' "$root/run/kelosyslog/receive.json" || fail "it does not wait"
    receiver=$(receiver_pid "$root")
    syslog_ng_control "$root" reload >/dev/null || fail "no reload"
    unlock_database
    landed $((total + 20000))
    wait_until 20 grep -q '"waiting":""' "$root/run/kelosyslog/receive.json" || fail "it still waits"
    total=$(($(row_count "$database") - 20000))
    expect "messages" "$(query 'SELECT count(DISTINCT msg), count(*) - count(DISTINCT msg) <= 1 FROM logs')" "$sent|1"
    await_counted $((total + 20000))
    expect "receiver after a reload" "$(receiver_pid "$root")" "$receiver"
    ;;
esac
send_lines <(make_messages 100 old 40001)
landed $((total + 20100))
# A rule that comes while everything runs.
"$KELO_BIN_DIR/kelosyslog" --root "$root" rules add zebras --keyword zebra
zebra_told() {
    send_lines <(echo '<13>Jan  1 00:00:00 zoo keeper: a zebra')
    total=$((total + 1))
    grep -rqs KEYWORD_MATCH "$root/var/spool/kelonotify/new"
}
wait_until 30 zebra_told || fail "the new rule does not fire"
landed $((total + 20100))
syslog_ng_stop "$root"
expect "rows" "$(row_count "$database")" $((total + 20100))
[[ $1 == database ]] || counted $((total + 20100)) || fail "not all are counted at the end"
expect "end of the last receiver" "$(sqlite3 "$root/usr/kelo/etc/kelosyslog.db" \
    "SELECT count(*) FROM log WHERE event = 'Server was stopped [kelosyslog receive].'")" 1
