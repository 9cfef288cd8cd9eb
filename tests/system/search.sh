# shellcheck shell=bash
# Searches give the same with and without the skip index while messages are stored, in every way of storing.
# usage: search.sh database|receiver|spool; KELO_SEARCHES searches (100).
source "$(dirname "$0")/support.sh"
define "$root/kelosyslog.conf" kelo_store "$1"
syslog_ng_start "$root"
make_messages 20000 old >"$root/lines"
send_lines "$root/lines"
landed 20000

# Slowly, because each search reads all rows once. A connection that breaks is followed by the next one.
send_endlessly() {
    local first
    for ((first = 20001; ; first += 1000)); do
        make_messages 1000 new $first | frame_lines >"$root/frames"
        send_frames "$root/frames" || true
        sleep 0.2
    done
}
send_endlessly &
sender=$!
status=0
"$KELO_BIN_DIR/skip_index_oracle" "${KELO_SEARCHES:-100}" "${KELO_SEED:-1}" "$database" >"$root/searches" 2>&1 || status=$?
kill $sender
cat "$root/searches"
expect "status of the searches" "$status" 0
(($(row_count "$database") > 20000)) || fail "nothing was stored beside the searches"
