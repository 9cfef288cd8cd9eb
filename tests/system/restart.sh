# shellcheck shell=bash
# What syslog-ng has taken over survives kill -9: messages that wait for a locked database are rows after the restart.
source "$(dirname "$0")/support.sh"
syslog_ng_start "$root"
make_messages 10 old >"$root/lines"
send_lines "$root/lines"
landed 10

lock_database

make_messages 3000 new 11 >"$root/lines"
send_lines "$root/lines" &
sender=$!
taken() { syslog_ng_control "$root" stats | grep -q '^dst.sql;d_kelo_database#0;[^;]*;a;processed;3010'; }
wait_until 60 taken || fail "not taken over while the database is locked: $(syslog_ng_control "$root" stats | grep d_kelo)"
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
