# Counts and pages are true while syslog-ng writes, until everything that was sent is there.
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
count=1
for ((round = 0; count < 40001 && round < 5000; ++round)); do
    before=$count
    # Nothing is deleted, so the newest page holds consecutive ids and reaches at least the count seen before.
    page=$("$KELO_BIN_DIR/kelosyslog" search --db "$database" -n 50 -o csv --no-header --fields id | tr -d '\r')
    ((${page##*$'\n'} >= before)) || fail "the newest page is older than the count of $before"
    expect "page" "$page" "$(seq $((${page##*$'\n'} > 50 ? ${page##*$'\n'} - 49 : 1)) "${page##*$'\n'}")"
    count=$("$KELO_BIN_DIR/kelosyslog" count --db "$database" --host '*')
    ((count >= before && count <= 40001)) || fail "count $count after $before"
done
wait "${senders[@]}"
expect "rows" "$(row_count "$database")" 40001
expect "count" "$count" 40001
