# shellcheck shell=bash
# What syslog-ng has taken over survives kill -9: messages that wait for a locked database are rows after the restart. Those that
# wait when another way of storing is chosen are handed over to it, each once and with its bytes.
source "$(dirname "$0")/support.sh"
define "$root/kelosyslog.conf" kelo_store database
syslog_ng_start "$root"
make_messages 10 old >"$root/lines"
send_lines "$root/lines"
landed 10

lock_database

make_messages 3000 new 11 >"$root/lines"
send_lines "$root/lines" &
sender=$!
taken() { syslog_ng_control "$root" stats | grep -q "^dst.sql;d_kelo_database#0;[^;]*;a;processed;$1"; }
wait_until 60 taken 3010 || fail "not taken over while the database is locked: $(syslog_ng_control "$root" stats | grep d_kelo)"
wait $sender
syslog_ng_stop "$root" KILL
expect "rows while locked" "$(row_count "$database")" 10
unlock_database

syslog_ng_start "$root"
make_messages 500 old 3011 >"$root/lines"
send_lines "$root/lines"
all_there() { [[ $(query 'SELECT count(DISTINCT msg) FROM logs') == 3510 ]]; }
wait_until 60 all_there || fail "$(query 'SELECT count(DISTINCT msg) FROM logs') of 3510 messages are there"
# At the most one batch is written twice.
(($(row_count "$database") <= 3510 + 1000)) || fail "$(row_count "$database") rows of 3510 messages"

query 'DELETE FROM logs'
rm "$root/commands" "$root/locked"
lock_database
make_messages 3000 new >"$root/lines"
for text in "${hostileTexts[@]}"; do
    printf '<163>1 - lab hostile 7 - - %s' "$text" | add_frame "$root/frames"
done
send_lines "$root/lines"
send_frames "$root/frames"
total=$((3000 + ${#hostileTexts[@]}))
waiting() { (($(syslog_ng_control "$root" stats | sed -n 's/^dst.sql;d_kelo_database#0;[^;]*;a;processed;//p') == 500 + total)); }
wait_until 60 waiting || fail "not taken over: $(syslog_ng_control "$root" stats | grep d_kelo)"
syslog_ng_stop "$root" KILL
unlock_database
buffer=("$root"/syslog-ng-*.rqf)
for seconds in 0.01 0.02 0.03 0.05 30; do
    { timeout --signal=KILL $seconds "$KELO_BIN_DIR/recover-buffer" database "${buffer[0]}" "$root/var/spool/kelosyslog" >"$root/out"; } 2>/dev/null || true
done
define "$root/kelosyslog.conf" kelo_store spool
syslog_ng_start "$root"
landed $total
make_messages 500 new 3001 >"$root/lines"
send_lines "$root/lines"
landed $((total + 500))
expect "rows, and different ones" "$(query 'SELECT count(*), count(DISTINCT msg) FROM logs')" "$((total + 500))|$((total + 500))"
for text in "${hostileTexts[@]}"; do
    expect "rows of ${text:0:30}" "$(row_count "$database" "host = 'lab' AND prog = 'hostile' AND prio = 'err' AND msg = '${text//\'/\'\'}'")" 1
done
