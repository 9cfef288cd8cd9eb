# shellcheck shell=bash
# Searches give the same with and without the skip index while messages are stored, in every way of storing, and while
# the database is archived, emptied, replaced and compacted, and builders of the index are killed.
# usage: search.sh database|receiver|spool; KELO_SEARCHES searches (100), KELO_SEED (1).
source "$(dirname "$0")/support.sh"
define "$root/kelosyslog.conf" kelo_store "$1"
mkdir "$root/run" # the commands find syslog-ng by it
ln -s ../syslog-ng.pid "$root/run/syslog-ng.pid"
syslog_ng_start "$root"
make_messages 20000 old >"$root/lines"
send_lines "$root/lines"
landed 20000
kelosyslog() { "$KELO_BIN_DIR/kelosyslog" --root "$root" "$@" --db "$database"; }

# Slowly, because each search reads all rows once. A connection that breaks is followed by the next one.
send_endlessly() {
    local first text
    for ((first = 20001; ; first += 1000)); do
        make_messages 1000 new $first | frame_lines >"$root/frames"
        for text in "${hostileTexts[@]}"; do
            printf '%s' "<13>1 - lab hostile - - - $text" | add_frame "$root/frames"
        done
        send_frames "$root/frames" || true
        sleep 0.2
    done
}

# What an administrator and timers do meanwhile. It may fail: the database is gone for a moment.
kill_builder() {
    timeout -s KILL "0.$((RANDOM % 10))$((RANDOM % 10))" "$KELO_BIN_DIR/kelosyslog" db index --build --db "$database"
}
happen_endlessly() {
    local -i happening
    trap 'wait; exit' TERM # when the command has ended
    for ((happening = 0; ; happening++)); do
        case $((RANDOM % 40)) in
            0) kelosyslog archive --remove-archived --yes && send_lines "$root/lines" ;;
            1) kelosyslog db quarantine --yes --force && send_lines "$root/lines" ;;
            2) kelosyslog db limit 1 && send_lines "$root/lines" ;;
            [3-7]) kelosyslog delete -g "#$((RANDOM % 10))" --yes ;;
            [89]) sql "$database" VACUUM ;;
            10) kelosyslog db index --remove ;;
            1[1-5]) kelosyslog count -g pending ;;
            1[6-9]) kill_builder & kill_builder & kill_builder ;;
            *) kelosyslog db index --build ;;
        esac || true
        echo $((happening + 1)) >"$root/happenings"
        sleep 0.1
    done >"$root/happened" 2>&1
}
trap 'kill $(jobs -p) 2>/dev/null || true; wait; clean_up || wait_until 20 rm -rf "$root"' EXIT # builders are in the background
RANDOM=${KELO_SEED:-1}
send_endlessly &
sender=$!
happen_endlessly &
happens=$!
status=0
"$KELO_BIN_DIR/skip_index_oracle" "${KELO_SEARCHES:-100}" "${KELO_SEED:-1}" "$database" >"$root/searches" 2>&1 || status=$?
kill $sender $happens
wait $happens || true
cat "$root/searches"
echo "$(<"$root/happenings") happenings beside them"
expect "status of the searches" "$status" 0
