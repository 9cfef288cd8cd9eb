# shellcheck shell=bash
# A handler runs transactions, checkpoints and queries while syslog-ng writes at full speed: no error, and every message is a row;
# for KELO_LOAD_SECONDS seconds (5). Then the database is damaged: the first statement that fails moves it away, the administrator
# is notified, and syslog-ng continues in a fresh database that contains everything sent afterwards.
source "$(dirname "$0")/support.sh"
define "$root/kelosyslog.conf" kelo_store database
mkdir "$root/run"
ln -s ../syslog-ng.pid "$root/run/syslog-ng.pid"
syslog_ng_start "$root"
send_lines <(make_messages 1 old)
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

# Every page but the first two, in place, so that it stays readable as a database.
query 'PRAGMA wal_checkpoint(TRUNCATE)' >/dev/null
for ((offset = 8192; offset < $(stat -c %s "$database"); offset += 65536)); do
    head -c 8 /dev/zero | tr '\0' '\377' | dd of="$database" bs=1 seek="$offset" conv=notrunc status=none
done
status=0
"$KELO_BIN_DIR/use_database" "$root" "$database" 2>"$root/reported" < <(sleep 60) || status=$?
expect "status of the handler" $status 3
grep -q 'error code is : 11' "$root/reported" || fail "$(head -c 500 "$root/reported")"
entries=("$root"/var/spool/kelonotify/new/*.json)
expect "notifications" "${#entries[@]}" 1
grep -q "\"%DBPATH%\": *\"$database\"" "${entries[0]}" || fail "$(<"${entries[0]}")"
wait_until 30 grep -q 'Configuration reload finished' "$root/syslog-ng.log" || fail "no reload"
send_frames <(make_messages 2000 new | frame_lines)
landed 2000
expect "rows of the fresh database" "$(query 'SELECT count(DISTINCT msg), min(id) FROM logs')" "2000|1"
expect "its integrity" "$(query 'PRAGMA integrity_check')" ok
