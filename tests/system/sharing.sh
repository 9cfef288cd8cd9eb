# shellcheck shell=bash
# A handler runs transactions, checkpoints and queries while syslog-ng writes at full speed: no error, and every
# message is a row. For KELO_LOAD_SECONDS seconds (5).
source "$(dirname "$0")/support.sh"
syslog_ng_start "$root"
make_messages 1 old >"$root/line"
send_lines "$root/line"
landed 1

mkfifo "$root/running"
"$KELO_BIN_DIR/use_database" "$root" "$database" <"$root/running" >"$root/rounds" 2>"$root/reported" &
user=$!
exec {running}>"$root/running"
make_messages 5000 old 2 >"$root/lines"
make_messages 5000 new 5002 | frame_lines >"$root/frames"
sent=1
until=$((SECONDS + ${KELO_LOAD_SECONDS:-5}))
exec {lines}>"/dev/tcp/127.0.0.1/$syslogPort" {frames}>"/dev/tcp/127.0.0.1/$framePort"
while ((SECONDS < until)); do # each connection takes more only when syslog-ng has read enough
    cat "$root/lines" >&$lines &
    sender=$!
    cat "$root/frames" >&$frames
    wait $sender
    sent=$((sent + 10000))
done
exec {lines}>&- {frames}>&-
wait_until 120 has_rows "$database" $sent || fail "only $(row_count "$database") of $sent messages arrived"
exec {running}>&-
wait $user || fail "the handler ended with $?"
[[ ! -s $root/reported ]] || fail "the handler: $(head -c 2000 "$root/reported")"
expect "rows" "$(row_count "$database")" $sent
(($(<"$root/rounds") >= 5)) || fail "only $(<"$root/rounds") rounds beside the writer"
expect "integrity" "$(query 'PRAGMA integrity_check')" ok
echo "$sent rows beside $(<"$root/rounds") rounds"
