# shellcheck shell=bash
# The database is removed, quarantined or emptied while readers have it open: whatever is sent afterwards is in the
# database within ten seconds, and no reader ends with an error or sees what it should not.
# usage: removal.sh database|receiver
source "$(dirname "$0")/support.sh"
define "$root/kelosyslog.conf" kelo_store "$1"
mkdir "$root/run"
trap 'kill $(jobs -p) 2>/dev/null || true; clean_up' EXIT
ln -s ../syslog-ng.pid "$root/run/syslog-ng.pid"
kelosyslog() { "$KELO_BIN_DIR/kelosyslog" --root "$root" "$@" --db "$database"; }

# A search whose pager stops reading, one that follows, and a program in the middle of reading its rows.
readers_start() {
    mkfifo "$root/pager" "$root/statements"
    kelosyslog search -n all >"$root/pager" &
    exec {pager}<"$root/pager"
    head -c 100 <&"$pager" >/dev/null
    timeout 300 "$KELO_BIN_DIR/kelosyslog" --root "$root" search -f -n 1 --db "$database" >"$root/followed" &
    follower=$!
    sqlite3 -batch "$database" <"$root/statements" >"$root/read" &
    exec {statements}>"$root/statements"
    printf '%s\n' '.timeout 5000' 'BEGIN;' 'SELECT count(*) FROM logs;' >&"$statements"
    wait_until 20 test -s "$root/read" || fail "nothing was read"
    wait_until 20 test -s "$root/followed" || fail "nothing was followed"
}
readers_end() {
    echo 'SELECT count(*) FROM logs; ROLLBACK;' >&"$statements"
    exec {statements}>&- {pager}<&-
    kill "$follower" || fail "$1: the search that follows has ended"
    wait
    expect "$1: rows of one reading" "$(uniq "$root/read" | wc -l)" 1
    rm "$root/pager" "$root/statements"
}

followed() { tail -n 1 "$root/followed" | grep -q " $((first - 1))\b"; }

first=1
send() { # COUNT, of both kinds, over long-lived and new connections
    make_messages "$1" old $first >"$root/lines"
    send_lines "$root/lines"
    first=$((first + $1))
}

has_reloaded() { (($(grep -c 'Configuration reload finished' "$root/syslog-ng.log") > reloads)); }
remove() { # ACTION, after which syslog-ng begins a fresh database
    reloads=$(grep -c 'Configuration reload finished' "$root/syslog-ng.log" || true)
    # shellcheck disable=SC2086 # several words
    kelosyslog $1 >"$root/out" 2>&1 || fail "$1: $(<"$root/out")"
    [[ $1 == archive* ]] || wait_until 10 has_reloaded || fail "$1: no reload"
}

syslog_ng_start "$root"
for action in 'db limit 1' 'db quarantine --yes --force' 'archive --remove-archived --yes' 'db limit 1' 'db quarantine --yes --force'; do
    send 20000
    landed 20000
    readers_start
    send 3000 # which stay in the write-ahead log, as the readers have not ended
    landed 23000
    remove "$action"
    start=$EPOCHREALTIME
    send 1000
    wait_until 10 has_rows "$database" 1000 || fail "$action: $(row_count "$database") of 1000 messages"
    echo "$action: $(bc <<<"$EPOCHREALTIME - $start") s"
    expect "$action: integrity" "$(query 'PRAGMA integrity_check')" ok
    wait_until 5 followed || fail "$action: $(tail -n 1 "$root/followed")"
    readers_end "$action"
    expect "$action: rows after the readers" "$(query 'SELECT count(*) FROM logs')" 1000
    remove "db limit 1"
done
