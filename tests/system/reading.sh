# The library reads true counts and pages while syslog-ng writes, until everything that was sent is there.
source "$(dirname "$0")/support.sh"
syslog_ng_start "$root"
make_messages 1 old >"$root/line"
send_lines "$root/line"
landed 1

senders=()
for first in 2 10002 20002 30002; do
    make_messages 10000 old $first >"$root/lines$first"
    send_lines "$root/lines$first" &
    senders+=($!)
done
"$KELO_BIN_DIR/watch_rows" "$database" 40001 || fail "the reader"
wait "${senders[@]}"
expect "rows" "$(row_count "$database")" 40001
