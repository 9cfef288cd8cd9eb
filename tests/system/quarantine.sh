# shellcheck shell=bash
# A database that is damaged under a running syslog-ng: the first statement that fails moves it away, the
# administrator is notified, and syslog-ng continues in a fresh database that contains everything sent afterwards.
source "$(dirname "$0")/support.sh"
mkdir "$root/run"
ln -s ../syslog-ng.pid "$root/run/syslog-ng.pid"

# smash FILE OFFSET: destroys the page of a database at this offset.
smash() { printf '\377\377\377\377\377\377\377\377' | dd of="$1" bs=1 seek="$2" conv=notrunc status=none; }

# damage PART: overwrites what syslog-ng has written, in place. The first page stays readable as the head of a database.
damage() {
    local offset
    case $1 in
    pages) for ((offset = 4096; offset < $(stat -c %s "$database"); offset += 4096)); do smash "$database" $offset; done ;;
    header) smash "$database" 100 ;; # where the schema begins
    wal) # 32 bytes, then pages with 24 bytes before each, of which the first four are its number
        for ((offset = 32; offset < $(stat -c %s "$database-wal"); offset += 4120)); do
            [[ $(od -An -tx1 -j $offset -N 4 "$database-wal") == ' 00 00 00 01' ]] || smash "$database-wal" $((offset + 24))
        done ;;
    esac
}
reloads() { grep -c 'Configuration reload finished' "$root/syslog-ng.log" || true; }
has_reloaded() { (($(reloads) > $1)); }

first=1
for part in pages header wal; do
    syslog_ng_start "$root"
    make_messages 3000 old $first >"$root/lines"
    send_lines "$root/lines"
    landed 3000
    # In the write-ahead log or, for the other two, in the file itself.
    [[ $part == wal ]] || query 'PRAGMA wal_checkpoint(TRUNCATE)' >/dev/null
    before=$(reloads)
    damage $part
    status=0
    "$KELO_BIN_DIR/use_database" "$root" "$database" 2>"$root/reported" < <(sleep 60) || status=$?
    [[ $status == 3 ]] || fail "$part: status $status: $(head -c 500 "$root/reported")"
    grep -q 'error code is : 11' "$root/reported" || fail "$part: $(head -c 500 "$root/reported")"
    [[ -s $database.corrupt ]] || fail "$part: nothing was put aside"
    entries=("$root"/var/spool/kelonotify/new/*.json)
    expect "$part: notifications" "${#entries[@]}" 1
    grep -q "\"%DBPATH%\": *\"$database\"" "${entries[0]}" || fail "$part: $(<"${entries[0]}")"
    wait_until 30 has_reloaded "$before" || fail "$part: no reload"

    make_messages 2000 new $((first + 3000)) | frame_lines >"$root/frames"
    send_frames "$root/frames"
    landed 2000
    expect "$part: rows of the fresh database" "$(query 'SELECT count(DISTINCT msg), min(id) FROM logs')" "2000|1"
    expect "$part: integrity" "$(query 'PRAGMA integrity_check')" ok
    syslog_ng_stop "$root"
    rm -rf "$database"* "$root/var/spool"
    first=$((first + 5000))
done
